#include "zelkord/network/bag/BagFailureReason.h"

#include <algorithm>

namespace zelkord {
namespace {

constexpr std::string_view kStatusPrefix = "statusCode ";

bool mentions(const std::string& text, std::string_view word) {
  return text.find(word) != std::string::npos;
}

std::string withDetail(std::string words, const std::string& detail) {
  return detail.empty() ? words : words + " (" + detail + ")";
}

std::string reasonOfNoConnection(const std::string& detail) {
  if (mentions(detail, "refused")) return "connection refused";
  if (mentions(detail, "unreachable") || mentions(detail, "No route")) return "network unreachable";
  return "no connection";
}

std::string reasonOfTransport(URLErrorCode code, const std::string& detail) {
  switch (code) {
    case URLErrorCode::Cancelled:
      return "cancelled";
    case URLErrorCode::TimedOut:
      return "no answer in time";
    case URLErrorCode::UnsupportedURL:
      return "not a URL that can be fetched";
    case URLErrorCode::HostNotFound:
      return "name does not resolve";
    case URLErrorCode::CannotConnect:
      return reasonOfNoConnection(detail);
    case URLErrorCode::ConnectionLost:
      return "connection lost";
    case URLErrorCode::TooManyRedirects:
      return "too many redirects";
    case URLErrorCode::Insecure:
      return "not encrypted, and not on this machine";
    case URLErrorCode::TooLarge:
      return "too large";
    case URLErrorCode::TLSFailure:
      return withDetail(
          mentions(detail, "certificate") ? "certificate not trusted" : "no secure connection",
          detail);
    case URLErrorCode::Other:
      break;
  }
  return withDetail("failed", detail);
}

}  // namespace

std::string bagFailureReason(const Error& error) {
  const auto detail = error.reason().value_or("");
  if (error.domain == kURLErrorDomain) {
    return reasonOfTransport(static_cast<URLErrorCode>(error.code), detail);
  }
  if (detail.starts_with(kStatusPrefix)) {
    return "HTTP status " + detail.substr(kStatusPrefix.size());
  }
  if (detail == "not JSON object") return "not JSON";
  if (detail == "no data") return "empty answer";
  return withDetail("failed", detail);
}

std::string urlForPeople(std::string_view url) {
  url = url.substr(0, url.find_first_of("?#"));
  const auto scheme = url.find("://");
  if (scheme == std::string_view::npos) return std::string(url);
  const auto authority = scheme + 3;
  const auto end = std::min(url.find('/', authority), url.size());
  const auto user = url.substr(0, end).rfind('@');
  if (user == std::string_view::npos || user < authority) return std::string(url);
  return std::string(url.substr(0, authority)).append(url.substr(user + 1));
}

}  // namespace zelkord
