#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "base/Export.h"
#include "base/Json.h"
#include "base/Time.h"

namespace zelkor {

// The configuration document that the service supplies, as one user agent sees it: an object in
// "agents" whose (lower-case) token occurs in the lower-cased user agent overrides top-level keys;
// of several, later ones win.
//
// A value of the wrong type counts as absent; where an override's value counts as absent, the one
// below it holds. Building never fails. Threading: immutable, any thread. Copies share the
// dictionary.
class ZK_EXPORT ZLKBag {
 public:
  ZLKBag(std::shared_ptr<const json::object> dictionary, std::optional<std::string> userAgent);

  // The dictionary it was made from, without overrides.
  const std::shared_ptr<const json::object>& rawBag() const { return dictionary_; }
  const std::optional<std::string>& userAgent() const { return userAgent_; }

  std::optional<std::string> version() const;  // "version", text or number
  bool isEnabled() const;                      // "enabled", true when absent
  bool feedbackEnabled() const;                // "feedback_enabled", false when absent
  bool lookupEnabled() const;                  // "lookup_enabled", false when absent

  // Absolute URLs; none when absent or empty.
  std::optional<std::string> warmURL() const;
  std::optional<std::string> searchURL() const;
  std::optional<std::string> moreResultsURL() const;
  std::optional<std::string> cardURL() const;
  std::optional<std::string> itemRelatedContentURL() const;
  std::optional<std::string> feedbackURL() const;
  std::optional<std::string> crowdsourcingURL() const;
  std::optional<std::string> urlForIdentifier(
      std::string_view imageIdentifier) const;  // "image_identifiers"

  std::size_t minimumQueryLength() const;  // UTF-16 units; 1 when absent
  std::optional<Duration> searchRenderTimeout()
      const;                                   // "search_render_timeout" is in milliseconds
  Duration timeoutIntervalForRequest() const;  // seconds there; 30 s when absent, 0 or below
  bool sendGeoEnvironmentHeader() const;
  std::set<std::string> supportedGeoLocationSources() const;
  std::optional<std::string> clientName() const;
  const json::object* morvaneConfiguration() const;  // routing proxy; null when absent
  const json::object* resources() const;             // name to URL
  std::vector<std::string> subscriptionProviderBundleIdentifierWhitelist() const;
  std::vector<std::string> subscriptionProviderDomainWhitelist() const;
  std::optional<Duration> subscriptionTTL() const;

 private:
  std::optional<std::string> _text(std::string_view key) const;
  std::optional<bool> _flag(std::string_view key) const;
  std::optional<double> _number(std::string_view key) const;
  const json::object* _object(std::string_view key) const;
  std::vector<std::string> _texts(std::string_view key) const;
  // The first answer of `read` from the overrides, last first, then from the dictionary.
  template <typename Read>
  auto _find(const Read& read) const;

  std::shared_ptr<const json::object> dictionary_;
  std::optional<std::string> userAgent_;
  std::vector<const json::object*> overrides_;  // inside dictionary_, in the order written
};

}  // namespace zelkor
