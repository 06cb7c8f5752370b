#include "zelkord/query/QueryKind.h"

#include <algorithm>

#include "base/Check.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"
#include "zelkord/query/LookupFlow.h"
#include "zelkord/query/MoreResultsFlow.h"
#include "zelkord/query/SearchFlow.h"

namespace zelkord {
namespace {

template <typename Flow>
void startFlow(const QueryKind& kind, std::shared_ptr<ClientState> state,
               std::shared_ptr<const ZLKRequest> request, ReplyCallback reply) {
  std::make_shared<Flow>(kind, std::move(state), std::move(request), std::move(reply))->start();
}

void answerNothing(const QueryKind&, std::shared_ptr<ClientState>,
                   std::shared_ptr<const ZLKRequest> request, ReplyCallback reply) {
  reply(request->queryId, std::nullopt, std::nullopt);
}

// With or without a mask of what is withheld.
template <typename Query, typename... Mask>
using FactoryOperation = std::optional<URLRequest> (ZLKNetworkRequestFactory::*)(
    const Query&, const ZLKBag*, const std::optional<UUID>&, Mask...);

template <auto operation>
std::optional<URLRequest> madeBy(const RequestParts& parts) {
  const auto make = [&]<typename Query, typename... Mask>(FactoryOperation<Query, Mask...> call) {
    return (parts.factory.*call)(static_cast<const Query&>(parts.query), parts.bag, parts.userGuid,
                                 Mask(parts.fieldMask)...);
  };
  return make(operation);
}

constexpr QueryKind kQueryKinds[] = {
    {.message = kinds::search,
     .start = startFlow<SearchFlow>,
     .goesStale = true,
     .trace = TracePair{TraceCode::SearchStart, TraceCode::SearchEnd},
     .makeRequest = madeBy<&ZLKNetworkRequestFactory::searchRequest>,
     .logName = "search",
     .category = Category::Search},
    {.message = kinds::moreResults,
     .start = startFlow<MoreResultsFlow>,
     .isAtEndpoint = true,
     .makeRequest = madeBy<&ZLKNetworkRequestFactory::moreResultsRequest>,
     .logName = "More results",
     .category = Category::MoreResults,
     .transport = QueryTransport::Retryable},
    {.message = kinds::card,
     .start = startFlow<FollowUpFlow>,
     .isAtEndpoint = true,
     .trace = TracePair{TraceCode::CardStart, TraceCode::CardEnd},
     .makeRequest = madeBy<&ZLKNetworkRequestFactory::cardRequest>,
     .logName = "Card",
     .category = Category::Card,
     .endpoint = 11,
     .transport = QueryTransport::Retryable,
     .exchangeLog = ExchangeLog::Silent},
    // The line about a disabled bag stands with those of the searches.
    {.message = kinds::zeroKeyword,
     .start = startFlow<BagGatedFlow>,
     .trace = TracePair{TraceCode::ZeroKeywordStart, TraceCode::ZeroKeywordEnd},
     .makeRequest = madeBy<&ZLKNetworkRequestFactory::zeroKeywordRequest>,
     .logName = "zkw",
     .category = Category::ZeroKeyword,
     .disabledCategory = Category::Search,
     .routing = QueryRouting::Direct},
    {.message = kinds::lookup,
     .start = startFlow<LookupFlow>,
     .trace = TracePair{TraceCode::LookupStart, TraceCode::LookupEnd},
     .makeRequest = madeBy<&ZLKNetworkRequestFactory::lookupRequest>,
     .logName = "lookup",
     .category = Category::LookUp,
     .transport = QueryTransport::Retryable},
    {.message = kinds::flightLookup, .start = answerNothing},
    {.message = kinds::flightSearch, .start = answerNothing},
};

}  // namespace

const QueryKind& queryKindOf(const ZLKRequest& request) {
  const auto* message = requestKindOf(request);
  const auto* found =
      std::ranges::find(kQueryKinds, message, [](const QueryKind& kind) { return &kind.message; });
  ZK_CHECK(found != std::end(kQueryKinds), "every kind of request stands in the table");
  return *found;
}

}  // namespace zelkord
