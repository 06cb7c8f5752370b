#include "zelkorctl/QueryRun.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <atomic>
#include <utility>

#include "base/Check.h"
#include "base/Mutex.h"
#include "corezelkor/client/ClientError.h"
#include "corezelkor/client/DiagnosticsClient.h"
#include "corezelkor/client/EndpointClient.h"
#include "zelkorctl/BagFetch.h"

namespace zelkorctl {
namespace {

template <typename Request>
std::shared_ptr<Request> newRequest() {
  return std::make_shared<Request>();
}

std::shared_ptr<ZLKRequest> lookupRequest(const Options& options, const std::string& text) {
  auto request = newRequest<ZLKLookupRequest>();
  request->lookupSelectionType = options.selectionType;
  request->queryContext = options.context.value_or(text);
  request->appBundleId = options.appBundleId;
  request->domain = options.hintDomain;
  return request;
}

std::shared_ptr<ZLKRequest> requestFor(const Query& query, const Options& options) {
  switch (query.kind) {
    case QueryKind::ZeroKeyword:
      return newRequest<ZLKZeroKeywordRequest>();
    case QueryKind::FlightLookup:
      return newRequest<ZLKFlightLookupRequest>();
    case QueryKind::FlightSearch:
      return newRequest<ZLKFlightSearchRequest>();
    case QueryKind::MoreResults: {
      auto request = newRequest<ZLKMoreResultsRequest>();
      request->moreResultsURL = query.url;
      return request;
    }
    case QueryKind::Card: {
      auto request = newRequest<ZLKCardRequest>();
      request->cardURL = query.url;
      return request;
    }
    case QueryKind::Lookup:
      return lookupRequest(options, query.text);
    case QueryKind::Search:
      break;
  }
  return newRequest<ZLKSearchRequest>();
}

Outcome::Kind kindOf(const ClientAnswer& answer, bool newest) {
  if (answer.reply) return Outcome::Kind::Answered;
  if (!answer.error) return newest ? Outcome::Kind::Nothing : Outcome::Kind::Stale;
  return isClientError(*answer.error, ClientErrorCode::TimedOut) ? Outcome::Kind::Dropped
                                                                 : Outcome::Kind::Failed;
}

}  // namespace

std::string_view nameOf(Outcome::Kind kind) {
  switch (kind) {
    case Outcome::Kind::Answered:
      return "answered";
    case Outcome::Kind::Stale:
      return "stale";
    case Outcome::Kind::Nothing:
      return "nothing";
    case Outcome::Kind::Failed:
      return "failed";
    case Outcome::Kind::Dropped:
      return "dropped";
  }
  return {};
}

std::string_view sourceOf(const Outcome& outcome) {
  if (!outcome.answer.reply) return {};
  return outcome.answer.reply->httpResponse ? "network" : "cache";
}

// Outlives the run in the call-backs of answers that are still to come.
struct QueryRun::Shared {
  Shared() { ZK_CHECK(wakeUp >= 0, "a run needs one event descriptor"); }
  ~Shared() { ::close(wakeUp); }

  void add(Outcome outcome) {
    const MutexLock lock(mutex);
    outcomes.push_back(std::move(outcome));
    ::eventfd_write(wakeUp, 1);
  }

  const int wakeUp = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
  std::atomic<std::int64_t> newest = 0;
  Mutex mutex;
  std::vector<Outcome> outcomes ZK_GUARDED_BY(mutex);
};

QueryRun::QueryRun(Client& client, const Options& options)
    : client_(client), options_(options), shared_(std::make_shared<Shared>()) {}

QueryRun::~QueryRun() = default;

int QueryRun::descriptor() const { return shared_->wakeUp; }

std::shared_ptr<const ZLKRequest> QueryRun::_request(const Query& query) const {
  auto request = requestFor(query, options_);
  request->queryId = lastQueryId_;
  request->clientQueryId = static_cast<std::uint64_t>(lastQueryId_);
  request->queryString = query.text;
  request->queryItems = options_.items;
  request->verboseReply = true;
  return request;
}

ZLKFuture<ClientAnswer> QueryRun::_ask(QueryKind kind, std::shared_ptr<const ZLKRequest> request) {
  const bool follows = kind == QueryKind::MoreResults || kind == QueryKind::Card;
  if (options_.endpoint && follows) return EndpointClient(client_).request(std::move(request));
  return client_.request(std::move(request));
}

void QueryRun::send(const Query& query) {
  const auto queryId = ++lastQueryId_;
  ++outstanding_;
  shared_->newest = queryId;
  const auto start = std::chrono::steady_clock::now();
  _ask(query.kind, _request(query))
      .then([shared = shared_, client = &client_, queryId, start, name = query.name(),
             asked = query.kind](const ClientAnswer& answer) {
        const std::chrono::duration<double, std::milli> time =
            std::chrono::steady_clock::now() - start;
        Outcome outcome{name, kindOf(answer, shared->newest == queryId), time.count(), answer, {},
                        asked};
        if (!mayMeanNoBag(answer.error)) return shared->add(std::move(outcome));
        // Runs on the client's own thread, so the client is there.
        DiagnosticsClient(*client).status().then(
            [shared, outcome](const ClientResult<std::string>& status) {
              auto explained = outcome;
              explained.bag = missingBagIn(status.value.value_or(""));
              shared->add(std::move(explained));
            });
      });
}

std::vector<Outcome> QueryRun::take() {
  std::vector<Outcome> outcomes;
  {
    const MutexLock lock(shared_->mutex);
    outcomes.swap(shared_->outcomes);
    eventfd_t count = 0;
    ::eventfd_read(shared_->wakeUp, &count);
  }
  outstanding_ -= outcomes.size();
  return outcomes;
}

std::vector<Outcome> QueryRun::takeAll() {
  auto all = take();
  while (hasOutstanding()) {
    pollfd waiting{descriptor(), POLLIN, 0};
    ::poll(&waiting, 1, -1);
    for (auto& outcome : take()) all.push_back(std::move(outcome));
  }
  return all;
}

Outcome QueryRun::ask(const Query& query) {
  ZK_CHECK(!hasOutstanding(), "one query at a time is asked and waited for");
  send(query);
  return std::move(takeAll().front());
}

}  // namespace zelkorctl
