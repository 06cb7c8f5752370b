#include "platform/linux/url/URLParts.h"

#include <arpa/inet.h>
#include <curl/curl.h>

#include <memory>

#include "base/Text.h"

namespace zelkord {
namespace {

using CurlURL = std::unique_ptr<CURLU, decltype(&curl_url_cleanup)>;

CurlURL parsedCurlURL(const std::string& url) {
  CurlURL handle(curl_url(), &curl_url_cleanup);
  if (curl_url_set(handle.get(), CURLUPART_URL, url.c_str(), 0) != CURLUE_OK) handle.reset();
  return handle;
}

std::optional<std::string> urlPart(const CurlURL& url, CURLUPart part, unsigned flags = 0) {
  char* text = nullptr;
  if (curl_url_get(url.get(), part, &text, flags) != CURLUE_OK) return std::nullopt;
  std::string copy(text);
  curl_free(text);
  return copy;
}

std::string asciiLowercased(std::string text) {
  for (char& c : text) c = c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c;
  return text;
}

}  // namespace

bool URLParts::isLoopback() const {
  if (host == "localhost" || host.ends_with(".localhost")) return true;
  in_addr v4{};
  if (inet_pton(AF_INET, host.c_str(), &v4) == 1) return ntohl(v4.s_addr) >> 24 == 127;
  if (host.size() < 3 || host.front() != '[') return false;
  in6_addr v6{};
  if (inet_pton(AF_INET6, host.substr(1, host.size() - 2).c_str(), &v6) != 1) return false;
  if (IN6_IS_ADDR_V4MAPPED(&v6)) return v6.s6_addr[12] == 127;
  return IN6_IS_ADDR_LOOPBACK(&v6);
}

std::optional<URLParts> parseURL(const std::string& url) {
  const auto handle = parsedCurlURL(url);
  if (!handle) return std::nullopt;
  const auto scheme = urlPart(handle, CURLUPART_SCHEME);
  const auto host = urlPart(handle, CURLUPART_HOST);
  if (!scheme || !host || host->empty()) return std::nullopt;
  return URLParts{
      .scheme = asciiLowercased(*scheme),
      .host = asciiLowercased(*host),
      .port = urlPart(handle, CURLUPART_PORT, CURLU_DEFAULT_PORT).value_or(""),
      .hasCredentials = url.find('@') != std::string::npos &&
                        (urlPart(handle, CURLUPART_USER) || urlPart(handle, CURLUPART_PASSWORD))};
}

std::string withoutCredentials(const std::string& url) {
  const auto handle = parsedCurlURL(url);
  if (!handle) return url;
  curl_url_set(handle.get(), CURLUPART_USER, nullptr, 0);
  curl_url_set(handle.get(), CURLUPART_PASSWORD, nullptr, 0);
  return urlPart(handle, CURLUPART_URL).value_or(url);
}

std::optional<std::string> resolveReference(const std::string& base, const std::string& reference) {
  const auto handle = parsedCurlURL(base);
  if (!handle) return std::nullopt;
  const unsigned flags = CURLU_URLENCODE | CURLU_NON_SUPPORT_SCHEME;
  if (curl_url_set(handle.get(), CURLUPART_URL, reference.c_str(), flags) != CURLUE_OK) return {};
  return urlPart(handle, CURLUPART_URL);
}

}  // namespace zelkord
