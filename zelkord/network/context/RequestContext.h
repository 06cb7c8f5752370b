#pragma once

#include <string>
#include <vector>

#include "corezelkor/Messages.h"
#include "zelkord/network/context/LocaleContext.h"
#include "zelkord/network/context/LocationContext.h"

namespace zelkord {

// The device's situation as requests tell it. Texts are ready to be sent; empty ones are left out.
struct RequestContext {
  LocaleContext locale;
  LocationContext location;
  std::string localTimeZoneName;
  std::string deviceCountryCode;
  std::string mapsClientMetadata;  // base64
  std::string storefrontIdentifier;
  std::string subscriptionInfo;  // JSON
  std::vector<QueryItem> debuggingQueryItems;
  bool isManagedAccount = false;
  bool deviceRestricted = false;
};

}  // namespace zelkord
