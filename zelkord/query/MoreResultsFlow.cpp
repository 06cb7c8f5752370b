#include "zelkord/query/MoreResultsFlow.h"

#include <algorithm>

#include "base/Text.h"
#include "zelkord/network/exchange/URLComponents.h"

namespace zelkord {

std::string MoreResultsFlow::_input() const {
  const auto url = URLComponents::parse(_as<ZLKMoreResultsRequest>().moreResultsURL);
  if (!url) return {};
  const auto found = std::ranges::find(url->queryItems, "q", &URLQueryItem::name);
  if (found == url->queryItems.end()) return {};
  auto text = found->value.value_or("");
  return isValidUtf8(text) ? text : std::string();
}

}  // namespace zelkord
