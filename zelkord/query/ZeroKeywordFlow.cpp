#include "zelkord/query/ZeroKeywordFlow.h"

#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/ZLKNetworkRequestFactory.h"

namespace zelkord {
namespace {

// The line about a disabled bag stands with those of the searches.
constexpr QueryTraits kZeroKeywordTraits = {.name = "zkw",
                                            .category = Category::ZeroKeyword,
                                            .disabledCategory = Category::Search,
                                            .routing = QueryRouting::Direct};

}  // namespace

ZeroKeywordFlow::ZeroKeywordFlow(std::shared_ptr<ClientState> state,
                                 std::shared_ptr<const ZLKZeroKeywordRequest> request,
                                 ReplyCallback reply)
    : BagGatedFlow(kZeroKeywordTraits, std::move(state), std::move(request), std::move(reply)) {}

std::optional<URLRequest> ZeroKeywordFlow::_makeRequest(const ZLKBag* bag,
                                                        const std::optional<UUID>& userGuid) {
  return assembly_.requestFactory()->zeroKeywordRequest(*request_, bag, userGuid,
                                                        state_->fieldMask());
}

}  // namespace zelkord
