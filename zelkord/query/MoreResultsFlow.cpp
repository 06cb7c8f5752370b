#include "zelkord/query/MoreResultsFlow.h"

#include <algorithm>

#include "base/Text.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/URLComponents.h"
#include "zelkord/network/ZLKNetworkRequestFactory.h"

namespace zelkord {
namespace {

constexpr QueryTraits kMoreResultsTraits = {.name = "More results",
                                            .category = Category::MoreResults,
                                            .transport = QueryTransport::Retryable};

}  // namespace

MoreResultsFlow::MoreResultsFlow(std::shared_ptr<ClientState> state,
                                 std::shared_ptr<const ZLKMoreResultsRequest> request,
                                 ReplyCallback reply)
    : FollowUpFlow(kMoreResultsTraits, std::move(state), request, std::move(reply)),
      more_(std::move(request)) {}

std::optional<URLRequest> MoreResultsFlow::_makeRequest(const ZLKBag* bag,
                                                        const std::optional<UUID>& userGuid) {
  return assembly_.requestFactory()->moreResultsRequest(*more_, bag, userGuid, state_->fieldMask());
}

std::string MoreResultsFlow::_input() const {
  const auto url = URLComponents::parse(more_->moreResultsURL);
  if (!url) return {};
  const auto found = std::ranges::find(url->queryItems, "q", &URLQueryItem::name);
  if (found == url->queryItems.end()) return {};
  auto text = found->value.value_or("");
  return isValidUtf8(text) ? text : std::string();
}

}  // namespace zelkord
