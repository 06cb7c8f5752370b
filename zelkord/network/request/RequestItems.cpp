#include "zelkord/network/request/RequestItems.h"

#include <algorithm>
#include <utility>

#include "zelkord/network/request/RequestItemTable.h"
#include "zelkord/network/request/ZelkorURLRequestBuilder.h"

namespace zelkord {
namespace items {
namespace {

constexpr RequestItem unlessWithheld(RequestItem item) {
  item.withheld = true;
  return item;
}

constexpr RequestItem kSearchItems[] = {
    kQuery,
    kSuggestedType,
    kClientItems,
    kDebugItems,
    kKey,
    kCard,
    kTopTopics,
    kCountryCode,
    kLocale,
    kSystemLanguage,
    kLanguages,
    kKeyboardInputMode,
    kCalendar,
    kTimeZone,
    kUnits,
    kTemperature,
    k24Hours,
    kGeoMetadata,
    unlessWithheld(kLatLng),
    unlessWithheld(kGeoSource),
    unlessWithheld(kAppSignature),
    kMode,
    kStorefront,
    kSubscriptions,
    kUserGuid,
    kUserAgent,
    kUIScale,
    kGeoEnvironment,
    kGeoSession,
};

constexpr RequestItem kZeroKeywordItems[] = {
    kZeroKeywordType,
    kClientItems,
    kDebugItems,
    kKey,
    kLocale,
    kSystemLanguage,
    kLanguages,
    kKeyboardInputMode,
    kCalendar,
    kTimeZone,
    kTemperature,
    kUnits,
    k24Hours,
    kCountryCode,
    kGeoMetadata,
    unlessWithheld(kLatLng),
    unlessWithheld(kGeoSource),
    kStorefront,
    kSubscriptions,
    kMode,
    kUserGuid,
    kUserAgent,
    kUIScale,
    kGeoEnvironment,
    kGeoSession,
};

constexpr RequestItem kMoreResultsItems[] = {
    kClientItems,
    kDebugItems,
    kKey,
    kLocale,
    kSystemLanguage,
    kLanguages,
    unlessWithheld(kLatLng),
    unlessWithheld(kGeoSource),
    unlessWithheld(kAppSignature),
    kStorefront,
    kSubscriptions,
    kMode,
    kUserGuid,
    kUserAgent,
    kUIScale,
};

constexpr RequestItem kLookupItems[] = {
    kQuery,       kClientItems,    kDebugItems,      kKey,
    kLocale,      kSystemLanguage, kLanguages,       kKeyboardInputMode,
    kCountryCode, kGeoMetadata,    kLatLng,          kGeoSource,
    kStorefront,  kSubscriptions,  kLookupContext,   kLookupDomain,
    kLookupType,  kQueryLanguage,  kContextLanguage, kMode,
    kUserGuid,    kUserAgent,      kUIScale,         kAppSignature,
    kGeoSession,
};

constexpr RequestItem kCardItems[] = {
    kClientItems, kDebugItems, kKey,          kLocale,     kSystemLanguage, kLanguages,
    kCountryCode, kLatLng,     kGeoSource,    kStorefront, kGeoMetadata,    kUserGuid,
    kUserAgent,   kUIScale,    kAppSignature, kGeoSession, kGeoEnvironment, kSubscriptions,
};

constexpr RequestItem kBagFetchItems[] = {
    kVersion,   kKey,         kDebugItems, kLocale,  kSystemLanguage,
    kLanguages, kCountryCode, kUserAgent,  kMorvane,
};

constexpr RequestItem kBagCacheItems[] = {
    kVersion, kDebugItems, kLocale, kSystemLanguage, kCountryCode, kAgent, kMorvane,
};

constexpr RequestItem kFileDownloadItems[] = {kKey, kUserAgent, kFuzzedLatLong, kIfNoneMatch};

constexpr RequestItem kFlusherUploadItems[] = {
    kDebugItems, kKey,       kCountryCode, kLocale,          kDiagnosticsEnabled,
    kLanguages,  kUserAgent, kDigest,      kContentEncoding,
};

}  // namespace
}  // namespace items

namespace {

// A header cannot say them; a value with one is left out.
bool hasControlBytes(std::string_view value) {
  return std::any_of(value.begin(), value.end(),
                     [](unsigned char c) { return c < 0x20 || c == 0x7F; });
}

void addItem(const RequestItem& item, const RequestInputs& inputs, const RequestContext& context,
             ZelkorURLRequestBuilder& builder) {
  auto value = item.value(inputs, context);
  if (value.empty() && item.presence != ItemPresence::Always) return;
  switch (item.kind) {
    case ItemKind::ForcedItem:
      builder.forceQueryItemWithName(item.name, std::move(value));
      break;
    case ItemKind::Header:
      if (hasControlBytes(value)) break;
      builder.defaultHttpHeaderWithName(item.name, std::move(value));
      break;
    default:
      builder.defaultQueryItemWithName(item.name, std::move(value));
      break;
  }
}

}  // namespace

constinit const RequestRecipe kSearchRecipe{items::kSearchItems, LocationRefresh::Always,
                                            RequestRouting::UnlessWithheld};
constinit const RequestRecipe kZeroKeywordRecipe{items::kZeroKeywordItems, LocationRefresh::Always,
                                                 RequestRouting::Never};
constinit const RequestRecipe kMoreResultsRecipe{
    items::kMoreResultsItems, LocationRefresh::UnlessInURL, RequestRouting::UnlessWithheld};
constinit const RequestRecipe kLookupRecipe{items::kLookupItems, LocationRefresh::Always,
                                            RequestRouting::UnlessWithheld};
constinit const RequestRecipe kCardRecipe{items::kCardItems, LocationRefresh::Never,
                                          RequestRouting::UnlessWithheld};
constinit const RequestRecipe kBagFetchRecipe{items::kBagFetchItems};
constinit const RequestRecipe kBagCacheRecipe{items::kBagCacheItems};
constinit const RequestRecipe kFileDownloadRecipe{items::kFileDownloadItems};
constinit const RequestRecipe kFlusherUploadRecipe{items::kFlusherUploadItems};

void addItems(const RequestRecipe& recipe, const RequestInputs& inputs,
              const RequestContext& context, ZelkorURLRequestBuilder& builder) {
  const bool withholds = (inputs.fieldMask & kFieldMaskWithholdLocation) != 0;
  for (const auto& item : recipe.items) {
    if (item.withheld && withholds) continue;
    if (item.kind == ItemKind::ClientItems) {
      builder.forceQueryItemsFromArray(inputs.query->queryItems);
    } else if (item.kind == ItemKind::DebugItems) {
      builder.forceQueryItemsFromArray(context.debuggingQueryItems);
    } else {
      addItem(item, inputs, context, builder);
    }
  }
}

}  // namespace zelkord
