#include "platform/api/URLRequest.h"

#include <algorithm>

namespace zelkord {
namespace {

char foldAscii(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; }

bool sameHeaderName(std::string_view a, std::string_view b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [](char x, char y) { return foldAscii(x) == foldAscii(y); });
}

std::optional<std::string> joinedHeader(const HTTPHeaders& headers, std::string_view name) {
  std::optional<std::string> joined;
  for (const auto& [key, value] : headers) {
    if (!sameHeaderName(key, name)) continue;
    joined = joined ? *joined + ", " + value : value;
  }
  return joined;
}

}  // namespace

std::optional<std::string> URLRequest::header(std::string_view name) const {
  return joinedHeader(headers, name);
}

std::optional<std::string> URLResponse::header(std::string_view name) const {
  return joinedHeader(headers, name);
}

URLRequest routedForm(URLRequest request) {
  request.routed = true;
  return request;
}

std::string urlForLog(std::string_view url, bool showsPrivateData) {
  const auto query = url.find('?');
  if (showsPrivateData || query == std::string_view::npos) return std::string(url);
  return std::string(url.substr(0, query)) + "?<private>";
}

}  // namespace zelkord
