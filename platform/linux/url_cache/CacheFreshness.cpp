#include "platform/linux/url_cache/CacheFreshness.h"

#include <algorithm>
#include <optional>
#include <string>

#include "platform/linux/url_cache/HTTPDate.h"

namespace zelkord {
namespace {

using Seconds = std::chrono::seconds;
using std::chrono::sys_seconds;

constexpr Seconds kMaximumHeuristicLifetime = std::chrono::hours(24);
constexpr int kHeuristicFraction = 10;

sys_seconds receivedSeconds(const StoredResponse& stored) {
  return std::chrono::floor<Seconds>(stored.receivedAt);
}

std::optional<sys_seconds> headerDate(const StoredResponse& stored, const char* name) {
  const auto text = stored.response.header(name);
  return text ? parseHTTPDate(*text, receivedSeconds(stored)) : std::nullopt;
}

// When the response was made: when it came, unless it says.
sys_seconds originDate(const StoredResponse& stored) {
  return headerDate(stored, "Date").value_or(receivedSeconds(stored));
}

Seconds heuristicLifetime(const StoredResponse& stored) {
  if (!isHeuristicallyCacheable(stored.response.status.value_or(0))) return Seconds(0);
  const auto modified = headerDate(stored, "Last-Modified");
  if (!modified) return Seconds(0);
  return std::clamp((originDate(stored) - *modified) / kHeuristicFraction, Seconds(0),
                    kMaximumHeuristicLifetime);
}

Seconds ageHeader(const StoredResponse& stored) {
  const auto text = stored.response.header("Age").value_or("");
  // Of several the first one counts.
  const auto first = withoutWhiteSpaceAround(std::string_view(text).substr(0, text.find(',')));
  return parseDeltaSeconds(first).value_or(Seconds(0));
}

}  // namespace

bool isHeuristicallyCacheable(int status) {
  constexpr int kStatuses[] = {200, 203, 204, 300, 301, 308, 404, 405, 410, 414, 501};
  return std::ranges::find(kStatuses, status) != std::end(kStatuses);
}

Seconds freshnessLifetime(const StoredResponse& stored) {
  const auto directives =
      parseCacheDirectives(stored.response.header("Cache-Control").value_or(""));
  if (directives.noStore || directives.noCache) return Seconds(0);
  if (directives.maxAge) return *directives.maxAge;
  if (!stored.response.header("Expires")) return heuristicLifetime(stored);
  const auto expires = headerDate(stored, "Expires");
  return expires ? std::max(*expires - originDate(stored), Seconds(0)) : Seconds(0);
}

Seconds currentAge(const StoredResponse& stored, WallTime now) {
  if (now < stored.receivedAt) return kUnknownAge;
  const auto inWhole = [](Duration duration) {
    return std::max(std::chrono::floor<Seconds>(duration), Seconds(0));
  };
  const auto apparent = std::max(receivedSeconds(stored) - originDate(stored), Seconds(0));
  const auto corrected = ageHeader(stored) + inWhole(stored.receivedAt - stored.requestedAt);
  return std::max(apparent, corrected) + inWhole(now - stored.receivedAt);
}

bool isFresh(const StoredResponse& stored, WallTime now, const CacheDirectives& request) {
  if (request.noCache || request.noStore) return false;
  const auto age = currentAge(stored, now);
  if (age == kUnknownAge || (request.maxAge && age > *request.maxAge)) return false;
  return freshnessLifetime(stored) > age + request.minFresh;
}

}  // namespace zelkord
