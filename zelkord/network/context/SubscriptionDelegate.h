#pragma once

#include <optional>
#include <string>

#include "base/Json.h"

namespace zelkord {

// Who is told about the user's subscriptions and the media store's storefront. Any thread.
class SubscriptionDelegate {
 public:
  virtual ~SubscriptionDelegate() = default;
  // All active ones; an empty list when there are none.
  virtual void didUpdateSubscriptionDictionaries(json::array subscriptions) = 0;
  virtual void didUpdateStorefrontIdentifier(std::optional<std::string> identifier) = 0;
};

}  // namespace zelkord
