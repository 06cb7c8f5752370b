#include "platform/linux/url/RequestPolicy.h"

#include <strings.h>

#include <algorithm>
#include <initializer_list>
#include <string_view>
#include <utility>

#include "platform/linux/url/URLParts.h"

namespace zelkord {
namespace {

constexpr Duration kDefaultTimeout = 60s;
constexpr Duration kMaximumTimeout = 24h * 7;

// RFC 9110, 5.6.2.
bool isHTTPToken(std::string_view text) {
  constexpr std::string_view kAllowed =
      "!#$%&'*+-.^_`|~0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";
  return !text.empty() && text.find_first_not_of(kAllowed) == std::string_view::npos;
}

bool breaksLine(std::string_view text) {
  constexpr std::string_view kBreaks("\r\n\0", 3);
  return text.find_first_of(kBreaks) != std::string_view::npos;
}

bool hasPrefixIgnoringCase(const std::string& text, std::string_view prefix) {
  return strncasecmp(text.c_str(), prefix.data(), prefix.size()) == 0;
}

bool isNamed(const std::string& name, std::initializer_list<const char*> names) {
  return std::ranges::any_of(
      names, [&](const char* other) { return strcasecmp(name.c_str(), other) == 0; });
}

std::optional<Error> refusalOfURL(const std::string& url) {
  if (breaksLine(url)) return urlError(URLErrorCode::UnsupportedURL, "control character in URL");
  const auto parts = parseURL(url);
  if (!parts) return urlError(URLErrorCode::UnsupportedURL, "unsupported URL");
  if (parts->scheme == "https") return std::nullopt;
  if (parts->scheme != "http") {
    return urlError(URLErrorCode::UnsupportedURL, "unsupported scheme " + parts->scheme);
  }
  if (!parts->isLoopback()) return urlError(URLErrorCode::Insecure, "insecure URL");
  return std::nullopt;
}

void followMethodRules(URLRequest& request, int status) {
  const bool becomesGet = status == 303 ? request.method != "GET" && request.method != "HEAD"
                                        : status <= 302 && request.method == "POST";
  if (!becomesGet) return;
  request.method = "GET";
  request.body = {};
  std::erase_if(request.headers,
                [](const auto& header) { return hasPrefixIgnoringCase(header.first, "Content-"); });
}

void dropPrivateHeaders(URLRequest& request) {
  std::erase_if(request.headers, [](const auto& header) {
    return hasPrefixIgnoringCase(header.first, "X-Quenta-") ||
           isNamed(header.first, {"Authorization", "Cookie", "Host"});
  });
}

}  // namespace

std::optional<Error> refusalOf(const URLRequest& request) {
  if (auto refusal = refusalOfURL(request.url)) return refusal;
  if (!isHTTPToken(request.method)) {
    return urlError(URLErrorCode::UnsupportedURL, "method is not a token");
  }
  for (const auto& [name, value] : request.headers) {
    if (!isHTTPToken(name)) {
      return urlError(URLErrorCode::UnsupportedURL, "header name is not a token");
    }
    if (breaksLine(value)) {
      return urlError(URLErrorCode::UnsupportedURL, "control character in header " + name);
    }
  }
  return std::nullopt;
}

bool isRedirect(const URLResponse& response) {
  const int status = response.status.value_or(0);
  const bool redirects =
      status == 301 || status == 302 || status == 303 || status == 307 || status == 308;
  return redirects && response.header("Location");
}

std::variant<URLRequest, Error> redirected(const URLRequest& request, const URLResponse& response) {
  const auto target = resolveReference(request.url, response.header("Location").value_or(""));
  if (!target) return urlError(URLErrorCode::UnsupportedURL, "unsupported redirect");
  const auto from = parseURL(request.url);
  const auto to = parseURL(*target);
  if (from && to && from->scheme == "https" && to->scheme == "http") {
    return urlError(URLErrorCode::Insecure, "redirect from https to http");
  }
  if (auto refusal = refusalOfURL(*target)) return *std::move(refusal);
  URLRequest next = request;
  next.url = *target;
  followMethodRules(next, response.status.value_or(0));
  if (!from || !from->sameEndpoint(*to)) dropPrivateHeaders(next);
  return next;
}

Duration timeoutOf(const URLRequest& request) {
  return request.timeout > 0s ? std::min(request.timeout, kMaximumTimeout) : kDefaultTimeout;
}

bool mayBeRepeated(const URLRequest& request) {
  return request.method == "GET" || request.method == "HEAD";
}

}  // namespace zelkord
