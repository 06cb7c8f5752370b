#pragma once

#include <boost/json/value.hpp>
#include <chrono>
#include <cstdint>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "sandbox/core/Outcome.h"
#include "sandbox/http/Message.h"

namespace sandbox {

// What control can make of an answer.
enum class MisbehaviourKind {
  None,
  BrokenJson,         // a JSON body that stops in the middle, at its full length
  Truncated,          // Content-Length longer than the bytes sent, then the end
  Endless,            // chunks without end (60 s or 100 MB)
  Close,              // the connection ends before any byte
  CloseAfterHeaders,  // headers, then the end
  WrongDigest,        // an upload is refused as if its digest did not match
  NotHttp,            // bytes that are no HTTP
  Slow,               // one byte of the body each `interval`
  Redirect,           // 302 to `location`
  GzipBomb,           // a small gzip body that unpacks to `bytes`
  Big,                // a JSON body of `bytes`
  DeepJson,           // arrays nested `depth` deep
  Pad,                // the ordinary answer, padded to about `bytes`
  WrongLength,        // the ordinary answer under a Content-Length of `bytes`
};

// How some requests are to be answered.
struct Misbehaviour {
  std::string path;             // this path, or with a '*' at the end everything that begins so
  std::uint64_t remaining = 1;  // requests still to be treated so
  bool forever = false;
  std::uint64_t skip = 0;  // requests let through first
  MisbehaviourKind kind = MisbehaviourKind::None;
  std::chrono::milliseconds delay{0};
  std::chrono::milliseconds interval{0};
  std::optional<unsigned> status;
  std::optional<std::string> body;
  std::string location;
  std::uint64_t bytes = 0;
  std::uint64_t depth = 0;
  Headers headers;
};

// Reads the JSON object of a control request; the failure says which key is wrong.
Outcome<Misbehaviour> parseMisbehaviour(const boost::json::value& value);

// The answer that takes the place of the ordinary one, if one does: the request is then never
// handled.
std::optional<Reply> replacementFor(const Misbehaviour& misbehaviour);

// Changes an answer, ordinary or not, on its way out.
void distort(const Misbehaviour& misbehaviour, Reply& reply);

// The misbehaviours in force, in the order they were asked for. The first that fits a request takes
// it.
//
// Threading: any thread.
class Misbehaviours final {
 public:
  void add(Misbehaviour misbehaviour);
  std::optional<Misbehaviour> take(std::string_view path);
  void clear();

 private:
  std::mutex mutex_;
  std::vector<Misbehaviour> rules_;
};

}  // namespace sandbox
