#include "corezelkor/ZLKBag.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>

#include "base/Text.h"

namespace zelkor {
namespace {

constexpr Duration kDefaultRequestTimeout = 30s;

std::string versionText(const json::value& value) {
  if (value.is_string()) return std::string(value.get_string());
  const auto number = asNumber(value);
  if (!number || !std::isfinite(*number)) return {};
  if (!value.is_double()) return json::serialize(value);
  // The shortest decimal text, without a fraction for a whole number however the service wrote it.
  std::array<char, 512> digits{};
  const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), *number,
                                 std::chars_format::fixed);
  return {digits.data(), end.ptr};
}

std::vector<std::string> stringsOf(const json::array& array) {
  std::vector<std::string> strings;
  for (const auto& element : array) {
    if (element.is_string()) strings.emplace_back(element.get_string());
  }
  return strings;
}

std::optional<std::string> unlessEmpty(std::optional<std::string> text) {
  return text && !text->empty() ? std::move(text) : std::nullopt;
}

}  // namespace

ZLKBag::ZLKBag(std::shared_ptr<const json::object> dictionary, std::optional<std::string> userAgent)
    : dictionary_(dictionary ? std::move(dictionary) : std::make_shared<const json::object>()),
      userAgent_(std::move(userAgent)) {
  const auto* agents = objectIn(*dictionary_, "agents");
  if (!agents || !userAgent_) return;
  const auto agent = lowercased(*userAgent_);
  for (const auto& entry : *agents) {
    const auto* keys = entry.value().if_object();
    if (keys && agent.find(std::string_view(entry.key())) != std::string::npos)
      overrides_.push_back(keys);
  }
}

template <typename Read>
auto ZLKBag::_find(const Read& read) const {
  for (auto layer = overrides_.rbegin(); layer != overrides_.rend(); ++layer) {
    if (auto found = read(**layer)) return found;
  }
  return read(*dictionary_);
}

std::optional<std::string> ZLKBag::_text(std::string_view key) const {
  return _find([key](const json::object& layer) { return stringIn(layer, key); });
}
std::optional<bool> ZLKBag::_flag(std::string_view key) const {
  return _find([key](const json::object& layer) { return boolIn(layer, key); });
}
std::optional<double> ZLKBag::_number(std::string_view key) const {
  return _find([key](const json::object& layer) { return numberIn(layer, key); });
}
const json::object* ZLKBag::_object(std::string_view key) const {
  return _find([key](const json::object& layer) { return objectIn(layer, key); });
}
std::vector<std::string> ZLKBag::_texts(std::string_view key) const {
  const auto* array = _find([key](const json::object& layer) { return arrayIn(layer, key); });
  return array ? stringsOf(*array) : std::vector<std::string>();
}

std::optional<std::string> ZLKBag::version() const {
  return _find([](const json::object& layer) -> std::optional<std::string> {
    const auto* value = layer.if_contains("version");
    if (!value || (!value->is_string() && !asNumber(*value))) return std::nullopt;
    return versionText(*value);
  });
}

bool ZLKBag::isEnabled() const { return _flag("enabled").value_or(true); }
bool ZLKBag::feedbackEnabled() const { return _flag("feedback_enabled").value_or(false); }
bool ZLKBag::lookupEnabled() const { return _flag("lookup_enabled").value_or(false); }

std::optional<std::string> ZLKBag::warmURL() const { return unlessEmpty(_text("warm_url")); }
std::optional<std::string> ZLKBag::searchURL() const { return unlessEmpty(_text("search_url")); }
std::optional<std::string> ZLKBag::moreResultsURL() const {
  return unlessEmpty(_text("more_results_url"));
}
std::optional<std::string> ZLKBag::cardURL() const { return unlessEmpty(_text("card_url")); }
std::optional<std::string> ZLKBag::itemRelatedContentURL() const {
  return unlessEmpty(_text("item_related_content_url"));
}
std::optional<std::string> ZLKBag::feedbackURL() const {
  return unlessEmpty(_text("feedback_url"));
}
std::optional<std::string> ZLKBag::crowdsourcingURL() const {
  return unlessEmpty(_text("crowdsourcing_url"));
}

std::optional<std::string> ZLKBag::urlForIdentifier(std::string_view imageIdentifier) const {
  const auto* identifiers = _object("image_identifiers");
  return identifiers ? unlessEmpty(stringIn(*identifiers, imageIdentifier)) : std::nullopt;
}

std::size_t ZLKBag::minimumQueryLength() const {
  constexpr double kLongest = 1e9;
  const auto number = _number("minimum_query_length");
  if (!number || !(*number == *number)) return 1;
  return static_cast<std::size_t>(std::clamp(*number, 0.0, kLongest));
}

std::optional<Duration> ZLKBag::searchRenderTimeout() const {
  const auto milliseconds = _number("search_render_timeout");
  if (!milliseconds) return std::nullopt;
  return durationOfSeconds(*milliseconds / 1000);
}

Duration ZLKBag::timeoutIntervalForRequest() const {
  const auto seconds = _number("timeout_interval_for_request");
  return seconds && *seconds > 0 ? durationOfSeconds(*seconds) : kDefaultRequestTimeout;
}

bool ZLKBag::sendGeoEnvironmentHeader() const {
  return _flag("send_geo_environment_header").value_or(false);
}

std::set<std::string> ZLKBag::supportedGeoLocationSources() const {
  const auto sources = _texts("supported_geo_location_sources");
  return {sources.begin(), sources.end()};
}

std::optional<std::string> ZLKBag::clientName() const { return _text("client_name"); }
const json::object* ZLKBag::morvaneConfiguration() const {
  return _object("morvane_configuration");
}
const json::object* ZLKBag::resources() const { return _object("resources"); }

std::vector<std::string> ZLKBag::subscriptionProviderBundleIdentifierWhitelist() const {
  return _texts("subscription_provider_bundle_identifier_whitelist");
}
std::vector<std::string> ZLKBag::subscriptionProviderDomainWhitelist() const {
  return _texts("subscription_provider_domain_whitelist");
}
std::optional<Duration> ZLKBag::subscriptionTTL() const {
  const auto seconds = _number("subscription_ttl");
  if (!seconds) return std::nullopt;
  return durationOfSeconds(*seconds);
}

}  // namespace zelkor
