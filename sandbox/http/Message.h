#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "sandbox/http/Target.h"

namespace sandbox {

using Headers = std::vector<std::pair<std::string, std::string>>;

// Names compare without regard to case. The first one, or nothing.
std::optional<std::string_view> findHeader(const Headers& headers, std::string_view name);

// Replaces every header of that name, or appends.
void setHeader(Headers& headers, std::string name, std::string value);

// A request as received.
struct Request {
  std::string method;
  std::string target;  // as on the request line
  std::string path;    // decoded
  std::vector<QueryItem> items;
  Headers headers;
  std::string body;
  std::uint64_t connection = 0;  // counts connections since the start, from 1
  bool tlsReused = false;        // the TLS session was resumed

  // The first item of that name that has a value.
  std::optional<std::string_view> item(std::string_view name) const;
  // Its value, or nothing, as a text.
  std::string itemOr(std::string_view name, std::string_view otherwise = {}) const;
  std::optional<std::string_view> header(std::string_view name) const {
    return findHeader(headers, name);
  }
};

// How a reply goes out.
enum class Delivery {
  Ordinary,
  Close,              // the connection ends before any byte
  CloseAfterHeaders,  // headers that announce a body, then the end
  Truncated,          // headers and half the body, then the end
  Endless,            // chunks without end, up to 60 s or 100 MB
  Slow,               // headers, then one byte each `interval`
  NotHttp,            // the body alone, then the end
  WrongLength,        // as if `announcedLength` bytes came; after too few of them, silence for 60 s
};

// What is sent back.
struct Reply {
  unsigned status = 200;
  Headers headers;
  std::shared_ptr<const std::string> body;
  // The same body packed with gzip, when it was prepared; set only where packing is allowed.
  std::shared_ptr<const std::string> gzipBody;
  bool mayPack = true;

  Delivery delivery = Delivery::Ordinary;
  std::chrono::milliseconds delay{0};
  std::chrono::milliseconds interval{0};
  std::size_t announcedLength = 0;

  const std::string& bodyText() const;

  static Reply json(unsigned status, std::string text);
  static Reply error(unsigned status, std::string_view reason);
  static Reply empty(unsigned status);
};

// The head of a response, up to the blank line. `contentLength` none means chunked.
std::string responseHead(const Reply& reply, std::optional<std::size_t> contentLength,
                         bool keepAlive);

}  // namespace sandbox
