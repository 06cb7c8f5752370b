#pragma once

#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "base/UUID.h"
#include "corezelkor/Messages.h"
#include "corezelkor/ZLKBag.h"
#include "zelkord/network/context/FieldMask.h"
#include "zelkord/network/context/RequestContext.h"

namespace zelkord {

class Assembly;
class ZelkorURLRequestBuilder;

// What one request is made of besides the context. Borrows for the time of building; each kind of
// request fills what its items read.
struct RequestInputs {
  const Assembly& assembly;
  const ZLKRequest* query = nullptr;
  const ZLKLookupRequest* lookup = nullptr;
  const ZLKBag* bag = nullptr;
  std::optional<UUID> userGuid;
  FieldMask fieldMask = kFieldMaskNone;
  std::optional<std::string> userAgent;  // the header's, or the bag identity's item
  std::optional<std::string> topics;     // JSON
  std::optional<std::string> appSignature;
  std::optional<std::string> queryLanguage;    // of a lookup
  std::optional<std::string> contextLanguage;  // of a lookup
  std::optional<std::string> version;          // of the bag or of a resource
  std::optional<std::string> digest;           // of an upload
  bool includeLatLong = false;
  bool useMorvane = false;
};

enum class ItemKind { DefaultItem, ForcedItem, Header, ClientItems, DebugItems };
enum class ItemPresence { WhenNotEmpty, Always };

// One query item or header: its name and where its value comes from.
struct RequestItem {
  ItemKind kind;
  std::string_view name;
  std::string (*value)(const RequestInputs& inputs, const RequestContext& context);
  ItemPresence presence = ItemPresence::WhenNotEmpty;
  bool withheld = false;  // left out when the mask withholds the location
};

enum class RequestRouting { Never, UnlessWithheld };
// When the location service is asked for a fix first.
enum class LocationRefresh { Never, Always, UnlessInURL };

// What a kind of request carries, in the order in which it is added.
struct RequestRecipe {
  std::span<const RequestItem> items;
  LocationRefresh locationRefresh = LocationRefresh::Never;
  RequestRouting routing = RequestRouting::Never;
};

extern const RequestRecipe kSearchRecipe;
extern const RequestRecipe kZeroKeywordRecipe;
extern const RequestRecipe kMoreResultsRecipe;
extern const RequestRecipe kLookupRecipe;
extern const RequestRecipe kCardRecipe;
extern const RequestRecipe kBagFetchRecipe;
extern const RequestRecipe kBagCacheRecipe;
extern const RequestRecipe kFileDownloadRecipe;
extern const RequestRecipe kFlusherUploadRecipe;

// Adds the recipe's items. Reads the context: call it inside a read of the store.
void addItems(const RequestRecipe& recipe, const RequestInputs& inputs,
              const RequestContext& context, ZelkorURLRequestBuilder& builder);

}  // namespace zelkord
