#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "base/Error.h"
#include "base/Json.h"

namespace zelkord {

// The services about the device and its user. Each answers from memory, on any thread; a change is
// announced in the notification centre.

// Read once at start.
class DeviceProperties {
 public:
  virtual ~DeviceProperties() = default;
  virtual std::string productType() const = 0;
  virtual std::string productName() const = 0;
  virtual std::string buildVersion() const = 0;
};

struct LocaleSnapshot {
  std::string identifier;                       // "en_US"
  std::string calendar;                         // ICU type, "gregorian"
  std::string measurementSystem;                // "Metric", "U.S.", "U.K." or another
  std::string hourFormat;                       // the date pattern for template "j", "h a" or "HH"
  std::string temperatureUnit;                  // of the locale: "Celsius" or "Fahrenheit"
  std::string preferredTemperatureUnit;         // the user's own choice; empty when there is none
  std::vector<std::string> preferredLanguages;  // BCP 47, best first
  std::string effectiveSystemLanguage;          // best system language for the preferred ones
};

class LocaleService {
 public:
  virtual ~LocaleService() = default;
  virtual LocaleSnapshot current() const = 0;    // changes: kCurrentLocaleChanged
  virtual std::string timeZoneName() const = 0;  // "Europe/Berlin"; changes: kTimeZoneChanged
};

// Maps services: country configuration, client metadata, the user session.
class MapsService {
 public:
  virtual ~MapsService() = default;
  virtual std::string countryCode() const = 0;  // "DE"; changes: kCountryCodeChanged
  virtual std::optional<std::string> clientMetadata()
      const = 0;  // base64; changes: kMapsClientMetadataInvalidated
  virtual std::optional<std::string> environmentName() const = 0;
  // The session entity's identifier, shared with maps; a reset replaces it first. The outer
  // optional: there is an entity; the inner one: it carries a session identifier.
  virtual std::optional<std::optional<std::string>> userSession(bool reset) = 0;
};

class AccountService {
 public:
  virtual ~AccountService() = default;
  virtual bool primaryAccountIsManaged()
      const = 0;  // changes: kAccountStoreChanged, kAccountCredentialsChanged
};

// Effective value of a three-way restriction.
enum class RestrictionValue { Unset = 0, Yes = 1, No = 2 };

// Device management. Changes: kEffectiveRestrictionsChanged.
class DeviceManagement {
 public:
  virtual ~DeviceManagement() = default;
  virtual RestrictionValue bookStoreAllowed() const = 0;
  virtual bool mediaStoreAllowed() const = 0;
  virtual bool appInstallationAllowed() const = 0;
  virtual RestrictionValue diagnosticsSubmissionAllowed() const = 0;
  // Stores `restrictions` (setting to value) as what `clientType` asks for, durable.
  virtual std::optional<Error> setVisibilityRestrictions(const std::string& clientType,
                                                         const json::object& restrictions) = 0;
};

// The network proxy service's configuration; how a request is routed is in URLSession.h.
class NetworkProxyService {
 public:
  virtual ~NetworkProxyService() = default;
  virtual bool isEnabled() const = 0;
  // Null takes the configuration away.
  virtual void setConfiguration(const json::object* configuration, const std::string& name) = 0;
};

class LinguisticTagger {
 public:
  virtual ~LinguisticTagger() = default;
  // BCP 47 tag of the language at the start of the text; "und" when unknown.
  virtual std::string languageAtStart(const std::string& text) const = 0;
};

class TextInputService {
 public:
  virtual ~TextInputService() = default;
  // The current input mode, else the first default one of the locale; may be empty.
  virtual std::string currentInputMode() const = 0;
  virtual double mainScreenScale() const = 0;
};

class RandomSource {
 public:
  virtual ~RandomSource() = default;
  virtual void fill(void* bytes, std::size_t count) = 0;
};

}  // namespace zelkord
