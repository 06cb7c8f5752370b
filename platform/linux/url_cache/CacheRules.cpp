#include "platform/linux/url_cache/CacheRules.h"

#include <strings.h>

#include <algorithm>
#include <initializer_list>

#include "platform/linux/url_cache/CacheDirectives.h"
#include "platform/linux/url_cache/CacheFreshness.h"
#include "platform/linux/url_cache/CacheValidation.h"
#include "platform/linux/url_cache/CacheVary.h"

namespace zelkord {
namespace {

using Names = std::initializer_list<const char*>;

// What makes a response fresh, or one to ask about.
constexpr Names kRulesOfCaching = {"Cache-Control", "Expires", "ETag", "Last-Modified"};

bool isOneOf(Names names, const std::string& header) {
  return std::ranges::any_of(
      names, [&](const char* name) { return strcasecmp(header.c_str(), name) == 0; });
}

bool hasAnyHeader(const HTTPHeaders& headers, Names names) {
  return std::ranges::any_of(headers,
                             [&](const auto& header) { return isOneOf(names, header.first); });
}

// Final, and with a whole content of its own.
bool isStorableStatus(int status) { return status >= 200 && status != 206 && status != 304; }

}  // namespace

CacheUse cacheUseOf(const URLRequest& request) {
  if (request.method != "GET") return CacheUse::None;
  if (hasAnyHeader(request.headers, {"Authorization", "Range"})) return CacheUse::None;
  if (requestDirectives(request).noStore) return CacheUse::None;
  const bool conditional = hasAnyHeader(
      request.headers,
      {"If-None-Match", "If-Modified-Since", "If-Match", "If-Unmodified-Since", "If-Range"});
  const bool ignores = request.cachePolicy == CachePolicy::ReloadIgnoringLocalCache;
  return conditional || ignores ? CacheUse::StoreOnly : CacheUse::LookUpAndStore;
}

CacheDirectives requestDirectives(const URLRequest& request) {
  if (const auto control = request.header("Cache-Control")) return parseCacheDirectives(*control);
  CacheDirectives directives;
  const auto pragma = request.header("Pragma");
  directives.noCache = pragma && strcasecmp(pragma->c_str(), "no-cache") == 0;
  return directives;
}

bool saysHowToStore(const URLResponse& response) {
  return hasAnyHeader(response.headers, kRulesOfCaching);
}

bool mayBeStored(const URLResult& result, const StoredResponse& candidate) {
  const int status = candidate.response.status.value_or(0);
  if (result.error || !result.data || !isStorableStatus(status)) return false;
  if (!mayAnswerTasks(candidate) || !varyNames(candidate.response)) return false;
  const auto control = candidate.response.header("Cache-Control").value_or("");
  const bool isKnown = isHeuristicallyCacheable(status);
  if (!isKnown && parseCacheDirectives(control).mustUnderstand) return false;
  if (freshnessLifetime(candidate) > std::chrono::seconds(0)) return true;
  return isKnown && hasValidator(candidate.response);
}

bool mayAnswerTasks(const StoredResponse& stored) {
  const auto control = stored.response.header("Cache-Control").value_or("");
  return stored.response.status && !parseCacheDirectives(control).noStore;
}

bool isUnsafeMethod(const URLRequest& request) {
  const auto safe = {"GET", "HEAD", "OPTIONS", "TRACE"};
  return std::ranges::none_of(safe, [&](const char* method) { return request.method == method; });
}

bool changesResource(const URLResult& result) {
  return !result.error && result.status() >= 200 && result.status() < 400;
}

}  // namespace zelkord
