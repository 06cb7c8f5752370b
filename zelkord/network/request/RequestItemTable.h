#pragma once

#include "zelkord/assembly/ServiceSessions.h"
#include "zelkord/network/request/RequestItems.h"

namespace zelkord::items {

// Every query item and header that a request may carry.

namespace values {

using Value = std::string(const RequestInputs& inputs, const RequestContext& context);
Value none, queryString, suggestedType, zeroKeywordType, key, card, locale, systemLanguage,
    countryCode, keyboardInputMode, calendar, timeZone, units, temperature, hours24, latLng,
    geoSource, mode, storefront, version, agent, morvane, lookupContext, lookupDomain, lookupType,
    queryLanguage, contextLanguage, diagnosticsEnabled, userGuid, userAgent, uiScale, languages,
    geoSession, geoEnvironment, geoMetadata, subscriptions, appSignature, topTopics, fuzzedLatLong,
    digest, contentEncoding;

}  // namespace values

inline constexpr RequestItem kClientItems{ItemKind::ClientItems, {}, values::none};
inline constexpr RequestItem kDebugItems{ItemKind::DebugItems, {}, values::none};

inline constexpr RequestItem kQuery{ItemKind::ForcedItem, "q", values::queryString};
inline constexpr RequestItem kSuggestedType{ItemKind::ForcedItem, "qtype", values::suggestedType};
inline constexpr RequestItem kZeroKeywordType{ItemKind::ForcedItem, "qtype",
                                              values::zeroKeywordType};

inline constexpr RequestItem kKey{ItemKind::DefaultItem, "key", values::key};
inline constexpr RequestItem kCard{ItemKind::DefaultItem, "card", values::card};
inline constexpr RequestItem kLocale{ItemKind::DefaultItem, "locale", values::locale};
inline constexpr RequestItem kSystemLanguage{ItemKind::DefaultItem, "esl", values::systemLanguage};
inline constexpr RequestItem kCountryCode{ItemKind::DefaultItem, "cc", values::countryCode};
inline constexpr RequestItem kKeyboardInputMode{ItemKind::DefaultItem, "kb_ime",
                                                values::keyboardInputMode};
inline constexpr RequestItem kCalendar{ItemKind::DefaultItem, "calendar", values::calendar};
inline constexpr RequestItem kTimeZone{ItemKind::DefaultItem, "time_zone", values::timeZone};
inline constexpr RequestItem kUnits{ItemKind::DefaultItem, "units", values::units};
inline constexpr RequestItem kTemperature{ItemKind::DefaultItem, "temp", values::temperature};
inline constexpr RequestItem k24Hours{ItemKind::DefaultItem, "24h", values::hours24};
inline constexpr RequestItem kLatLng{ItemKind::DefaultItem, "latlng", values::latLng};
inline constexpr RequestItem kGeoSource{ItemKind::DefaultItem, "geosrc", values::geoSource};
inline constexpr RequestItem kMode{ItemKind::DefaultItem, "mode", values::mode};
inline constexpr RequestItem kStorefront{ItemKind::DefaultItem, "storefront", values::storefront};
inline constexpr RequestItem kVersion{ItemKind::DefaultItem, "version", values::version};
inline constexpr RequestItem kAgent{ItemKind::DefaultItem, "agent", values::agent};
inline constexpr RequestItem kMorvane{ItemKind::DefaultItem, "morvane", values::morvane};
inline constexpr RequestItem kLookupContext{ItemKind::DefaultItem, "context", values::lookupContext,
                                            ItemPresence::Always};
inline constexpr RequestItem kLookupDomain{ItemKind::DefaultItem, "ldomain", values::lookupDomain};
inline constexpr RequestItem kLookupType{ItemKind::DefaultItem, "ltype", values::lookupType};
inline constexpr RequestItem kQueryLanguage{ItemKind::DefaultItem, "qlang", values::queryLanguage};
inline constexpr RequestItem kContextLanguage{ItemKind::DefaultItem, "lctxlang",
                                              values::contextLanguage};
inline constexpr RequestItem kDiagnosticsEnabled{ItemKind::DefaultItem, "du_enabled",
                                                 values::diagnosticsEnabled};

inline constexpr RequestItem kUserGuid{ItemKind::Header, kUserGuidHeader, values::userGuid};
inline constexpr RequestItem kUserAgent{ItemKind::Header, "User-Agent", values::userAgent};
inline constexpr RequestItem kUIScale{ItemKind::Header, "X-Quenta-UI-Scale", values::uiScale};
inline constexpr RequestItem kLanguages{ItemKind::Header, "X-Quenta-Languages", values::languages};
inline constexpr RequestItem kGeoSession{ItemKind::Header, "X-Quenta-GeoSession",
                                         values::geoSession};
inline constexpr RequestItem kGeoEnvironment{ItemKind::Header, "X-Quenta-GeoEnvironment",
                                             values::geoEnvironment};
inline constexpr RequestItem kGeoMetadata{ItemKind::Header, "X-Quenta-GeoMetadata",
                                          values::geoMetadata};
inline constexpr RequestItem kSubscriptions{ItemKind::Header, "X-Quenta-Subscriptions",
                                            values::subscriptions};
inline constexpr RequestItem kAppSignature{ItemKind::Header, "X-Quenta-Whitelisted-App-Signature",
                                           values::appSignature};
inline constexpr RequestItem kTopTopics{ItemKind::Header, "X-Quenta-TopTopics", values::topTopics};
inline constexpr RequestItem kFuzzedLatLong{ItemKind::Header, "X-Quenta-FuzzedLatLong",
                                            values::fuzzedLatLong};
inline constexpr RequestItem kIfNoneMatch{ItemKind::Header, "If-None-Match", values::version};
inline constexpr RequestItem kDigest{ItemKind::Header, "X-Quenta-Digest", values::digest};
inline constexpr RequestItem kContentEncoding{ItemKind::Header, "Content-Encoding",
                                              values::contentEncoding};

}  // namespace zelkord::items
