#pragma once

#include "halvane/Feedback.h"

namespace zelkord {

// The feedback that only the daemon makes.

// A lookup's request went out.
struct ZLKLookupStartNetworkSearchFeedback final : HVStartNetworkSearchFeedback {
  std::string_view className() const override { return "ZLKLookupStartNetworkSearchFeedback"; }

  std::uint32_t lookupSelectionType = 0;  // 0 default, 1 explicit, 2 hint
};

// The end of a network search whose answer carried the service's own fields.
struct ZLKEndNetworkSearchFeedback final : HVEndNetworkSearchFeedback {
  std::string_view className() const override { return "ZLKEndNetworkSearchFeedback"; }

  std::optional<std::string> zelkorStatus;
  std::optional<double> zelkorDuration;  // milliseconds, as the service says
  std::optional<std::string> fbq;
  std::optional<std::string> partialClientIp;
};

// A query that was not sent. `triggerEvent` is the reason: 1 too short, 2 bag disabled, 3 no bag.
struct ZLKSkipSearchFeedback final : HVFeedback {
  ZLKSkipSearchFeedback(std::uint32_t event, std::string text)
      : triggerEvent(event), input(std::move(text)) {}
  std::string_view className() const override { return "ZLKSkipSearchFeedback"; }

  std::uint32_t triggerEvent;
  std::string input;
};

// A query answered from the cache; `uuid` is the request's that fetched the answer.
struct ZLKCacheHitFeedback final : HVFeedback {
  ZLKCacheHitFeedback(std::uint32_t event, std::string text, std::string identifier)
      : triggerEvent(event), input(std::move(text)), uuid(std::move(identifier)) {}
  std::string_view className() const override { return "ZLKCacheHitFeedback"; }

  std::uint32_t triggerEvent;
  std::string input;
  std::string uuid;
};

// A client's connection went away.
struct ZelkorConnectionInvalidated final : HVFeedback {
  std::string_view className() const override { return "ZelkorConnectionInvalidated"; }
};

}  // namespace zelkord
