#include "zelkord/network/request/RequestItemTable.h"

#include <fmt/core.h>

#include "zelkord/assembly/Assembly.h"

namespace zelkord::items::values {
namespace {

// The credential that every request carries which the service answers.
constexpr const char* kRequestKey = "harbor4817";

// Trigger events of a query that the user did not type.
constexpr std::uint32_t kSuggestionChosen[] = {8, 10};

}  // namespace

std::string none(const RequestInputs&, const RequestContext&) { return {}; }

// What was asked.

std::string queryString(const RequestInputs& inputs, const RequestContext&) {
  return inputs.query->queryString;
}
std::string suggestedType(const RequestInputs& inputs, const RequestContext&) {
  const auto event = inputs.query->triggerEvent;
  return event == kSuggestionChosen[0] || event == kSuggestionChosen[1] ? "suggested" : "";
}
std::string zeroKeywordType(const RequestInputs&, const RequestContext&) { return "zkw"; }
std::string key(const RequestInputs&, const RequestContext&) { return kRequestKey; }
// Always, whichever client the bag names.
std::string card(const RequestInputs&, const RequestContext&) { return "1"; }
std::string keyboardInputMode(const RequestInputs& inputs, const RequestContext&) {
  return inputs.query->keyboardInputMode;
}
std::string uiScale(const RequestInputs& inputs, const RequestContext&) {
  const double scale = inputs.query->scale;
  return scale > 0 ? fmt::format("{:.1f}", scale) : std::string();
}
std::string topTopics(const RequestInputs& inputs, const RequestContext&) {
  return inputs.topics.value_or("");
}
std::string userGuid(const RequestInputs& inputs, const RequestContext&) {
  return inputs.userGuid ? inputs.userGuid->string() : std::string();
}
std::string userAgent(const RequestInputs& inputs, const RequestContext&) {
  return inputs.userAgent.value_or("");
}
std::string appSignature(const RequestInputs& inputs, const RequestContext&) {
  return inputs.appSignature.value_or("");
}

// Lookups.

std::string lookupContext(const RequestInputs& inputs, const RequestContext&) {
  return inputs.lookup->appBundleId;
}
std::string lookupDomain(const RequestInputs& inputs, const RequestContext&) {
  return inputs.lookup->domain;
}
std::string lookupType(const RequestInputs& inputs, const RequestContext&) {
  switch (inputs.lookup->lookupSelectionType) {
    case 1:
      return "explicit";
    case 2:
      return "hint";
    default:
      return "default";
  }
}
std::string queryLanguage(const RequestInputs& inputs, const RequestContext&) {
  return inputs.queryLanguage.value_or("");
}
std::string contextLanguage(const RequestInputs& inputs, const RequestContext&) {
  return inputs.contextLanguage.value_or("");
}

// The device's situation.

std::string locale(const RequestInputs&, const RequestContext& c) { return c.locale.identifier; }
std::string systemLanguage(const RequestInputs&, const RequestContext& c) {
  return c.locale.effectiveSystemLanguage;
}
std::string languages(const RequestInputs&, const RequestContext& c) {
  return c.locale.preferredLanguages;
}
std::string calendar(const RequestInputs&, const RequestContext& c) {
  return c.locale.calendarIdentifier;
}
std::string units(const RequestInputs&, const RequestContext& c) {
  return c.locale.measurementSystem;
}
std::string temperature(const RequestInputs&, const RequestContext& c) {
  return c.locale.tempUnits;
}
std::string hours24(const RequestInputs&, const RequestContext& c) {
  return c.locale.is24hDateFormat;
}
std::string timeZone(const RequestInputs&, const RequestContext& c) { return c.localTimeZoneName; }
std::string countryCode(const RequestInputs&, const RequestContext& c) {
  return c.deviceCountryCode;
}
std::string latLng(const RequestInputs&, const RequestContext& c) { return c.location.latLng; }
std::string geoSource(const RequestInputs&, const RequestContext& c) { return c.location.source; }
std::string fuzzedLatLong(const RequestInputs& inputs, const RequestContext& c) {
  return inputs.includeLatLong ? c.location.lookupLatLng : std::string();
}
std::string mode(const RequestInputs&, const RequestContext& c) {
  return c.isManagedAccount || c.deviceRestricted ? "managed" : "";
}
std::string storefront(const RequestInputs&, const RequestContext& c) {
  return c.storefrontIdentifier;
}
std::string subscriptions(const RequestInputs&, const RequestContext& c) {
  return c.subscriptionInfo;
}
std::string geoMetadata(const RequestInputs&, const RequestContext& c) {
  return c.mapsClientMetadata;
}

// Maps keeps its sessions and its environment itself; it answers from memory.

std::string geoSession(const RequestInputs& inputs, const RequestContext&) {
  const auto session = inputs.assembly.mapsSessions().ofRequest(inputs.userGuid);
  if (!session) return {};
  if (!*session) {
    inputs.assembly.log(Category::Request)
        .error(
            "GEOUserSessionEntity does not respond to selector sessionIDString, actual class is {}",
            "MapsUserSession");
  }
  return session->value_or("");
}
std::string geoEnvironment(const RequestInputs& inputs, const RequestContext&) {
  if (!inputs.bag || !inputs.bag->sendGeoEnvironmentHeader()) return {};
  return inputs.assembly.platform().maps.environmentName().value_or("");
}

// The bag, resources, uploads.

std::string version(const RequestInputs& inputs, const RequestContext&) {
  return inputs.version.value_or("");
}
std::string agent(const RequestInputs& inputs, const RequestContext&) {
  return inputs.userAgent.value_or("");
}
std::string morvane(const RequestInputs& inputs, const RequestContext&) {
  return inputs.useMorvane ? "1" : "0";
}
std::string diagnosticsEnabled(const RequestInputs& inputs, const RequestContext&) {
  const auto allowed = inputs.assembly.platform().management.diagnosticsSubmissionAllowed();
  return allowed == RestrictionValue::Yes ? "1" : "";
}
std::string digest(const RequestInputs& inputs, const RequestContext&) {
  return inputs.digest.value_or("");
}
std::string contentEncoding(const RequestInputs&, const RequestContext&) { return "deflate"; }

}  // namespace zelkord::items::values
