// Reads any bytes as the headers of a request, of a response to it, and of a later 304: three
// texts with an empty line between, a header a line.

#include <chrono>
#include <cstdint>
#include <string_view>

#include "base/Check.h"
#include "platform/linux/url_cache/CacheFreshness.h"
#include "platform/linux/url_cache/CacheRules.h"
#include "platform/linux/url_cache/CacheValidation.h"
#include "platform/linux/url_cache/CacheVary.h"
#include "platform/linux/url_cache/StoredHead.h"

namespace zelkord {
namespace {

constexpr WallTime kFuzzTime{std::chrono::seconds(1'795'348'800)};

std::string_view takeUntil(std::string_view& text, std::string_view end) {
  const auto part = text.substr(0, text.find(end));
  text.remove_prefix(std::min(part.size() + end.size(), text.size()));
  return part;
}

HTTPHeaders takeHeaders(std::string_view& text) {
  HTTPHeaders headers;
  for (auto lines = takeUntil(text, "\n\n"); !lines.empty();) {
    auto line = takeUntil(lines, "\n");
    const auto name = takeUntil(line, ":");
    headers.emplace_back(name, withoutWhiteSpaceAround(line));
  }
  return headers;
}

void checkTimes(const URLRequest& request, const StoredResponse& stored) {
  constexpr std::chrono::seconds kZero(0);
  ZK_CHECK(freshnessLifetime(stored) >= kZero, "a lifetime is not negative");
  bool fresh = true;
  for (const auto passed : {Duration(0s), Duration(1s), Duration(1h), Duration(876000h)}) {
    const auto now = kFuzzTime + passed;
    ZK_CHECK(currentAge(stored, now) >= kZero, "an age is not negative");
    const bool still = isFresh(stored, now, requestDirectives(request));
    ZK_CHECK(fresh || !still, "time makes nothing fresh");
    fresh = still;
  }
  ZK_CHECK(!isFresh(stored, kFuzzTime - 1s, {}), "what comes from the future is not fresh");
}

void checkConditions(const URLRequest& request, const StoredResponse& stored) {
  const auto conditional = conditionalRequest(request, stored);
  ZK_CHECK((conditional.headers.size() > request.headers.size()) == hasValidator(stored.response),
           "a validator can be asked with");
  for (std::size_t i = request.headers.size(); i < conditional.headers.size(); ++i) {
    constexpr std::string_view kBreaks("\r\n\0", 3);
    ZK_CHECK(conditional.headers[i].second.find_first_of(kBreaks) == std::string::npos,
             "a condition can stand in a request");
  }
}

void checkVary(const URLRequest& request, const URLResponse& response) {
  const auto names = varyNames(response);
  if (!names) return;
  URLResponse again{.headers = {{"Vary", *names}}};
  ZK_CHECK(varyNames(again) == names, "names are in their normal form");
  ZK_CHECK(variantOf(*names, request) == variantOf(*names, request), "a variant is one");
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  std::string_view text(reinterpret_cast<const char*>(data), size);
  const URLRequest request{.url = "https://host/", .headers = takeHeaders(text)};
  const StoredResponse stored{.response = {.status = 200, .headers = takeHeaders(text)},
                              .requestedAt = kFuzzTime,
                              .receivedAt = kFuzzTime};
  const URLResponse notModified{.status = 304, .headers = takeHeaders(text)};
  checkTimes(request, stored);
  if (cacheUseOf(request) == CacheUse::LookUpAndStore) checkConditions(request, stored);
  checkVary(request, stored.response);
  const URLResult result{.data = stored.body, .response = stored.response};
  if (mayBeStored(result, stored)) {
    ZK_CHECK(saysHowToStore(stored.response) && mayAnswerTasks(stored), "one rule, not two");
  }
  auto fresh = freshened(stored, notModified, kFuzzTime, kFuzzTime);
  checkTimes(request, fresh);
  const auto read = decodeStoredHead(encodeStoredHead(fresh));
  ZK_CHECK(read && read->response.headers == fresh.response.headers, "what is written is read");
  return 0;
}
