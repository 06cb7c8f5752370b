#include "zelkord/query/CardFlow.h"

#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/ZLKNetworkRequestFactory.h"

namespace zelkord {
namespace {

constexpr QueryTraits kCardTraits = {.name = "Card",
                                     .category = Category::Card,
                                     .endpoint = 11,
                                     .transport = QueryTransport::Retryable,
                                     .exchangeLog = ExchangeLog::Silent};

}  // namespace

CardFlow::CardFlow(std::shared_ptr<ClientState> state,
                   std::shared_ptr<const ZLKCardRequest> request, ReplyCallback reply)
    : FollowUpFlow(kCardTraits, std::move(state), request, std::move(reply)),
      card_(std::move(request)) {}

std::optional<URLRequest> CardFlow::_makeRequest(const ZLKBag* bag,
                                                 const std::optional<UUID>& userGuid) {
  return assembly_.requestFactory()->cardRequest(*card_, bag, userGuid);
}

}  // namespace zelkord
