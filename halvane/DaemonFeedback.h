#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <tuple>
#include <vector>

#include "halvane/ModelFeedback.h"

namespace zelkor {

// The feedback that only the daemon makes. Clients may not send it.

// A lookup's request went out. Sent with the selection in the place of the trigger event.
struct ZLKLookupStartNetworkSearchFeedback final
    : FeedbackRecord<ZLKLookupStartNetworkSearchFeedback>,
      NetworkSearchStart {
  static constexpr FeedbackDescription kDescription = {"ZLKLookupStartNetworkSearchFeedback", 1};

  Term<vocabulary::kLookupSelectionTypes> lookupSelectionType;

  static constexpr auto fields() {
    using T = ZLKLookupStartNetworkSearchFeedback;
    return std::tuple_cat(
        std::tuple{sent(8, "trigger_event", &T::lookupSelectionType)}, startFields(),
        std::tuple{stored(2, "search_trigger_event", &NetworkSearchStart::triggerEvent)});
  }
};

// The end of a network search whose answer carried the service's own fields.
struct ZLKEndNetworkSearchFeedback final : FeedbackRecord<ZLKEndNetworkSearchFeedback>,
                                           NetworkSearchEnd {
  static constexpr FeedbackDescription kDescription = {"ZLKEndNetworkSearchFeedback", 2,
                                                       QueryIds::None};

  std::optional<std::string> zelkorStatus;
  std::optional<double> zelkorDuration;  // milliseconds, as the service says
  std::optional<std::string> fbq;
  std::optional<std::string> partialClientIp;

  static constexpr auto fields() {
    using T = ZLKEndNetworkSearchFeedback;
    return std::tuple_cat(
        endFields(),
        std::tuple{sent(9, "zelkor_status", &T::zelkorStatus),
                   sent(10, "zelkor_duration", &T::zelkorDuration), sent(11, "fbq", &T::fbq),
                   sent(12, "zelkor_partial_client_ip", &T::partialClientIp)});
  }
};

// A query that was not sent, and why.
struct ZLKSkipSearchFeedback final : FeedbackRecord<ZLKSkipSearchFeedback> {
  static constexpr FeedbackDescription kDescription = {"ZLKSkipSearchFeedback", 26};

  ZLKSkipSearchFeedback() = default;
  ZLKSkipSearchFeedback(std::int32_t event, std::string text)
      : triggerEvent(event), input(std::move(text)) {}

  Term<vocabulary::kSkipSearchReasons> triggerEvent;
  std::optional<std::string> input;

  static constexpr auto fields() {
    using T = ZLKSkipSearchFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent), sent(3, "input", &T::input)};
  }
};

// A query answered from the cache; `uuid` is the request's that fetched the answer.
struct ZLKCacheHitFeedback final : FeedbackRecord<ZLKCacheHitFeedback> {
  static constexpr FeedbackDescription kDescription = {"ZLKCacheHitFeedback", 26};

  ZLKCacheHitFeedback() = default;
  ZLKCacheHitFeedback(std::int32_t event, std::string text, std::string identifier)
      : triggerEvent(event), input(std::move(text)), uuid(std::move(identifier)) {}

  Term<vocabulary::kSkipSearchReasons> triggerEvent;
  std::optional<std::string> input;
  std::optional<std::string> uuid;

  static constexpr auto fields() {
    using T = ZLKCacheHitFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent), sent(3, "input", &T::input),
                      sent(4, "uuid", &T::uuid)};
  }
};

// The session ended; the last record of one.
struct ZelkorSessionEndFeedback final : FeedbackRecord<ZelkorSessionEndFeedback> {
  static constexpr FeedbackDescription kDescription = {"ZelkorSessionEndFeedback", 25,
                                                       QueryIds::None};

  ZelkorSessionEndFeedback() = default;
  explicit ZelkorSessionEndFeedback(std::int64_t trigger) : reason(trigger) {}

  static constexpr const auto& eventTypes() { return vocabulary::kSessionEndReasons; }
  static constexpr std::string_view triggerEventEnumToString(std::int64_t trigger) {
    return entryOf(eventTypes(), trigger);
  }

  Term<vocabulary::kSessionEndReasons, std::int64_t> reason;

  static constexpr auto fields() {
    return std::tuple{sent(2, "reason", &ZelkorSessionEndFeedback::reason)};
  }
};

// Results that records refer to by identifier and that no record describes.
struct ZelkorSessionMissingResults final : FeedbackRecord<ZelkorSessionMissingResults> {
  static constexpr FeedbackDescription kDescription = {"ZelkorSessionMissingResults", 29,
                                                       QueryIds::None};

  ZelkorSessionMissingResults() = default;
  explicit ZelkorSessionMissingResults(PackedList<HVSearchResult> missing)
      : results(std::move(missing)) {}

  PackedList<HVSearchResult> results;

  static constexpr auto fields() {
    return std::tuple{sent(2, "results", &ZelkorSessionMissingResults::results)};
  }
};

// The same for suggestions.
struct ZelkorSessionMissingSuggestions final : FeedbackRecord<ZelkorSessionMissingSuggestions> {
  static constexpr FeedbackDescription kDescription = {"ZelkorSessionMissingSuggestions", 30,
                                                       QueryIds::None};

  ZelkorSessionMissingSuggestions() = default;
  explicit ZelkorSessionMissingSuggestions(PackedList<HVSuggestion> missing)
      : suggestions(std::move(missing)) {}

  PackedList<HVSuggestion> suggestions;

  static constexpr auto fields() {
    return std::tuple{sent(2, "suggestions", &ZelkorSessionMissingSuggestions::suggestions)};
  }
};

// A client's connection went away. Nothing of it is sent but that it happened.
struct ZelkorConnectionInvalidated final : FeedbackRecord<ZelkorConnectionInvalidated> {
  static constexpr FeedbackDescription kDescription = {"ZelkorConnectionInvalidated", 32,
                                                       QueryIds::None};

  static constexpr auto fields() { return std::tuple<>(); }
};

}  // namespace zelkor
