// Reads any bytes as the answer to a bag fetch, and uses the bag that comes of them.

#include <cstdint>
#include <optional>
#include <string>

#include "base/Check.h"
#include "corezelkor/ZLKBag.h"
#include "zelkord/network/bag/BagRefreshRule.h"
#include "zelkord/network/bag/BagResponse.h"

namespace zelkord {
namespace {

class NoLog final : public LogSink {
 public:
  bool isEnabled(LogLevel) const override { return true; }
  bool showsPrivateData() const override { return false; }
  void write(LogLevel, std::string_view, std::string_view) override {}
};

void readURLs(const ZLKBag& bag) {
  for (const auto& url : {bag.warmURL(), bag.searchURL(), bag.moreResultsURL(), bag.cardURL(),
                          bag.itemRelatedContentURL(), bag.feedbackURL(), bag.crowdsourcingURL(),
                          bag.urlForIdentifier("icon")}) {
    ZK_CHECK(!url || !url->empty(), "a URL is not empty");
  }
}

// Keeps what is read from being optimised away.
std::size_t readAll(const ZLKBag& bag) {
  readURLs(bag);
  ZK_CHECK(bag.timeoutIntervalForRequest() > Duration::zero(), "a time-out is positive");
  const bool flags = bag.isEnabled() && bag.feedbackEnabled() && bag.lookupEnabled() &&
                     bag.sendGeoEnvironmentHeader() && bag.morvaneConfiguration() &&
                     bag.resources() && bag.searchRenderTimeout() && bag.subscriptionTTL();
  return bag.version().value_or("").size() + bag.clientName().value_or("").size() +
         bag.minimumQueryLength() + bag.supportedGeoLocationSources().size() +
         bag.subscriptionProviderBundleIdentifierWhitelist().size() +
         bag.subscriptionProviderDomainWhitelist().size() + (flags ? 1 : 0);
}

void checkRefreshRule(const json::object& bag) {
  const auto decide = [&bag](double seconds) {
    return decideBagRefresh(&bag, wallTimeOfSeconds(seconds), [] { return std::string_view("u"); });
  };
  const bool disabled = decide(0).reason == BagRefreshDecision::Reason::Disabled;
  ZK_CHECK(disabled == bag.contains(kBagRefreshDisabledKey), "one key switches it off");
  // What is due stays due.
  ZK_CHECK(!decide(1e9).isRequired() || decide(2e9).isRequired(), "time makes no bag fresh");
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  URLResult result;
  result.response = URLResponse{"https://host/bag", 200, {}};
  result.data = Data(std::string(reinterpret_cast<const char*>(data), size));
  NoLog log;
  const auto response = readBagResponse(result, kDefaultMaximumBagSize, {log, "bag"});
  ZK_CHECK(response.dictionary.has_value() != response.error.has_value(), "a bag or an error");
  if (!response.dictionary) return 0;
  checkRefreshRule(*response.dictionary);
  const auto dictionary = std::make_shared<const json::object>(*response.dictionary);
  const std::optional<std::string> agents[] = {std::nullopt, "", "news/1.0", "X \xC3\x89 Messages"};
  for (const auto& agent : agents) {
    volatile auto sum = readAll(ZLKBag(dictionary, agent));
    (void)sum;
  }
  return 0;
}
