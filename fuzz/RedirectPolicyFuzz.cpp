// Lines of text as a request and the redirect that answers it: method, URL, status, Location, then
// a header a line. A request that may be sent leads only to requests that may be.

#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>
#include <variant>

#include "base/Check.h"
#include "platform/linux/url/RequestPolicy.h"
#include "platform/linux/url/URLParts.h"

namespace zelkord {
namespace {

std::string takeRedirectLine(std::string_view& text) {
  const auto line = text.substr(0, text.find('\n'));
  text.remove_prefix(std::min(line.size() + 1, text.size()));
  return std::string(line);
}

HTTPHeaders takeRedirectHeaders(std::string_view& text) {
  HTTPHeaders headers;
  while (!text.empty()) {
    const auto line = takeRedirectLine(text);
    const auto colon = line.find(':');
    if (colon == std::string::npos) continue;
    headers.emplace_back(line.substr(0, colon), line.substr(colon + 1));
  }
  return headers;
}

void checkNext(const URLRequest& before, const URLRequest& next) {
  const auto from = parseURL(before.url);
  const auto to = parseURL(next.url);
  ZK_CHECK(!refusalOf(next), "what is followed may be sent");
  ZK_CHECK(from && to, "both lead somewhere");
  ZK_CHECK(to->scheme == "https" || (from->scheme == "http" && to->isLoopback()), "as safe");
  ZK_CHECK(next.headers.size() <= before.headers.size(), "nothing is added");
  if (from->sameEndpoint(*to)) return;
  for (const char* name : {"X-Quenta-Identifier", "Authorization", "Cookie", "Host"}) {
    ZK_CHECK(!next.header(name), "private headers stay");
  }
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  if (size > 16'384) return 0;
  std::string_view text(reinterpret_cast<const char*>(data), size);
  URLRequest request{.method = takeRedirectLine(text)};
  request.url = takeRedirectLine(text);
  URLResponse response{.url = request.url};
  response.status = std::atoi(takeRedirectLine(text).c_str());
  response.headers = {{"Location", takeRedirectLine(text)}};
  request.headers = takeRedirectHeaders(text);
  if (const auto parts = parseURL(request.url)) {
    const auto plain = parseURL(withoutCredentials(request.url));
    ZK_CHECK(plain && !plain->hasCredentials && plain->sameEndpoint(*parts), "the same place");
  }
  if (refusalOf(request) || !isRedirect(response)) return 0;
  const auto next = redirected(request, response);
  if (const auto* followed = std::get_if<URLRequest>(&next)) checkNext(request, *followed);
  return 0;
}
