#include "zelkord/query/MoreResultsFlow.h"

#include <algorithm>

#include "base/Text.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/feedback/FeedbackSeams.h"
#include "zelkord/network/exchange/URLComponents.h"

namespace zelkord {
namespace {

std::string queryOf(const std::string& moreResultsURL) {
  const auto url = URLComponents::parse(moreResultsURL);
  if (!url) return {};
  const auto found = std::ranges::find(url->queryItems, "q", &URLQueryItem::name);
  if (found == url->queryItems.end()) return {};
  auto text = found->value.value_or("");
  return isValidUtf8(text) ? text : std::string();
}

}  // namespace

std::string MoreResultsFlow::_input() const {
  return queryOf(_as<ZLKMoreResultsRequest>().moreResultsURL);
}

std::shared_ptr<const HVFeedback> MoreResultsFlow::_makeStart(const URLRequest& request) const {
  if (auto* streams = assembly_.flusherXPCListener()) streams->willAskForMoreResults(_input());
  return FollowUpFlow::_makeStart(request);
}

}  // namespace zelkord
