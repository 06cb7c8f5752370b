#include "platform/linux/url_cache/CacheValidation.h"

#include <strings.h>

#include <algorithm>
#include <optional>
#include <set>
#include <string>

#include "platform/linux/url_cache/CacheDirectives.h"
#include "platform/linux/url_cache/HTTPDate.h"

namespace zelkord {
namespace {

constexpr std::size_t kMaximumValidator = 1024;
constexpr const char* kConnectionHeaders[] = {"connection",
                                              "keep-alive",
                                              "proxy-authenticate",
                                              "proxy-authorization",
                                              "proxy-connection",
                                              "proxy-authentication-info",
                                              "te",
                                              "transfer-encoding",
                                              "upgrade"};
// What describes the message on its way; the stored body is the decoded one.
constexpr const char* kContentHeaders[] = {"content-length", "content-encoding", "content-range"};

// A header that can go back into a request: one, not empty, in printable characters.
std::optional<std::string> validatorHeader(const URLResponse& response, const char* name) {
  const auto count = std::ranges::count_if(response.headers, [name](const auto& header) {
    return strcasecmp(header.first.c_str(), name) == 0;
  });
  auto value = count == 1 ? response.header(name) : std::nullopt;
  const auto isControl = [](char c) { return static_cast<unsigned char>(c) < 0x20 || c == 0x7F; };
  if (!value || value->empty() || value->size() > kMaximumValidator) return std::nullopt;
  if (std::ranges::any_of(*value, isControl)) return std::nullopt;
  return value;
}

std::optional<std::string> entityTag(const URLResponse& response) {
  return validatorHeader(response, "ETag");
}

std::optional<std::string> lastModified(const URLResponse& response) {
  auto value = validatorHeader(response, "Last-Modified");
  return value && parseHTTPDate(*value, {}) ? value : std::nullopt;
}

std::string_view withoutWeakness(std::string_view tag) {
  return tag.starts_with("W/") ? tag.substr(2) : tag;
}

std::set<std::string> namesOfConnection(const HTTPHeaders& headers) {
  std::set<std::string> names(std::begin(kConnectionHeaders), std::end(kConnectionHeaders));
  for (const auto& [name, value] : headers) {
    if (strcasecmp(name.c_str(), "Connection") != 0) continue;
    for (std::string_view rest = value; !rest.empty();) {
      names.insert(lowerCasedASCII(takeListElement(rest).value_or("")));
    }
  }
  return names;
}

}  // namespace

bool hasValidator(const URLResponse& response) {
  return entityTag(response) || lastModified(response);
}

URLRequest conditionalRequest(const URLRequest& request, const StoredResponse& stored) {
  URLRequest conditional = request;
  if (auto tag = entityTag(stored.response)) {
    conditional.headers.emplace_back("If-None-Match", *std::move(tag));
  }
  if (auto date = lastModified(stored.response)) {
    conditional.headers.emplace_back("If-Modified-Since", *std::move(date));
  }
  return conditional;
}

URLRequest unconditionalRequest(URLRequest request) {
  std::erase_if(request.headers, [](const auto& header) {
    return strcasecmp(header.first.c_str(), "If-None-Match") == 0 ||
           strcasecmp(header.first.c_str(), "If-Modified-Since") == 0;
  });
  return request;
}

bool confirms(const URLResponse& notModified, const StoredResponse& stored) {
  const auto theirs = notModified.header("ETag");
  const auto ours = stored.response.header("ETag");
  return !theirs || !ours || withoutWeakness(*theirs) == withoutWeakness(*ours);
}

StoredResponse freshened(const StoredResponse& stored, const URLResponse& notModified,
                         WallTime requestedAt, WallTime receivedAt) {
  auto news = endToEndHeaders(notModified.headers);
  std::erase_if(news, [](const auto& header) {
    return std::ranges::any_of(kContentHeaders, [&](const char* name) {
      return strcasecmp(header.first.c_str(), name) == 0;
    });
  });
  StoredResponse fresh = stored;
  std::set<std::string> replaced = {"age"};  // that of the old answer
  for (const auto& header : news) replaced.insert(lowerCasedASCII(header.first));
  std::erase_if(fresh.response.headers, [&](const auto& header) {
    return replaced.contains(lowerCasedASCII(header.first));
  });
  fresh.response.headers.insert(fresh.response.headers.end(), news.begin(), news.end());
  fresh.requestedAt = requestedAt;
  fresh.receivedAt = receivedAt;
  return fresh;
}

HTTPHeaders endToEndHeaders(const HTTPHeaders& headers) {
  const auto excluded = namesOfConnection(headers);
  HTTPHeaders kept;
  for (const auto& header : headers) {
    if (!excluded.contains(lowerCasedASCII(header.first))) kept.push_back(header);
  }
  return kept;
}

}  // namespace zelkord
