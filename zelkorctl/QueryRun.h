#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/Json.h"
#include "corezelkor/client/Client.h"
#include "zelkorctl/Options.h"

namespace zelkorctl {

// One query.
struct Query {
  QueryKind kind = QueryKind::Search;
  std::string text;
  std::string url;  // of further results or a card; empty: the bag's

  // What people call it by.
  const std::string& name() const { return text.empty() ? url : text; }
};

// What became of one query.
struct Outcome {
  enum class Kind {
    Answered,  // with a reply
    Stale,     // with nothing, after a newer query had gone out
    Nothing,   // with nothing, being the newest
    Failed,    // with an error
    Dropped,   // not at all, in the time given
  };

  std::string text;  // the query's name
  Kind kind = Kind::Nothing;
  double milliseconds = 0;
  ClientAnswer answer;
  std::optional<json::object> bag;  // what the daemon says of it, when it failed for want of one
  QueryKind asked = QueryKind::Search;
};

std::string_view nameOf(Outcome::Kind kind);

// "cache" for an answer that the daemon gave out of its query cache, "network" for one that came
// from the service, nothing without an answer. Every query is sent as one that wants a verbose
// reply: the daemon then tells the response that it got, and has none to tell on a cache hit.
std::string_view sourceOf(const Outcome& outcome);

// Sends queries of one client and collects what becomes of them.
//
// Threading: one thread; answers come from the client's. Ownership: the client outlives it; answers
// that come after its end are dropped.
class QueryRun {
 public:
  QueryRun(Client& client, const Options& options);
  ~QueryRun();

  void send(const Query& query);
  bool hasOutstanding() const { return outstanding_ > 0; }
  // Readable while outcomes wait to be taken.
  int descriptor() const;
  // In the order in which they came.
  std::vector<Outcome> take();
  // Waits for all; gives what came, in that order too.
  std::vector<Outcome> takeAll();
  // Sends it and waits. Nothing else may be outstanding.
  Outcome ask(const Query& query);

 private:
  struct Shared;

  std::shared_ptr<const ZLKRequest> _request(const Query& query) const;
  ZLKFuture<ClientAnswer> _ask(QueryKind kind, std::shared_ptr<const ZLKRequest> request);

  Client& client_;
  const Options& options_;
  const std::shared_ptr<Shared> shared_;
  std::int64_t lastQueryId_ = 0;
  std::size_t outstanding_ = 0;
};

}  // namespace zelkorctl
