#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "corezelkor/client/Client.h"
#include "zelkorctl/Options.h"

namespace zelkorctl {

// What became of one query.
struct Outcome {
  enum class Kind {
    Answered,  // with a reply
    Stale,     // with nothing, after a newer query had gone out
    Nothing,   // with nothing, being the newest
    Failed,    // with an error
    Dropped,   // not at all, in the time given
  };

  std::string text;
  Kind kind = Kind::Nothing;
  double milliseconds = 0;
  ClientAnswer answer;
};

std::string_view nameOf(Outcome::Kind kind);

// Sends queries of one client and collects what becomes of them.
//
// Threading: one thread; answers come from the client's. Ownership: the client outlives it; answers
// that come after its end are dropped.
class QueryRun {
 public:
  QueryRun(Client& client, const Options& options);
  ~QueryRun();

  void send(const std::string& text);
  bool hasOutstanding() const { return outstanding_ > 0; }
  // Readable while outcomes wait to be taken.
  int descriptor() const;
  // In the order in which they came.
  std::vector<Outcome> take();
  // Waits for all; gives what came, in that order too.
  std::vector<Outcome> takeAll();

 private:
  struct Shared;

  std::shared_ptr<const ZLKRequest> _request(const std::string& text) const;

  Client& client_;
  const Options& options_;
  const std::shared_ptr<Shared> shared_;
  std::int64_t lastQueryId_ = 0;
  std::size_t outstanding_ = 0;
};

}  // namespace zelkorctl
