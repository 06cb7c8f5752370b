#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <type_traits>

#include "base/Namespace.h"

namespace zelkor {

// A kind of feedback: its record's place in the list of all.
enum class FeedbackKind : std::uint8_t {};

template <typename... Records>
struct FeedbackList {
  static constexpr std::size_t kSize = sizeof...(Records);

  template <typename Record>
  static constexpr FeedbackKind kindOf() {
    static_assert((std::is_same_v<Record, Records> || ...), "every kind stands in the list");
    constexpr std::array<bool, kSize> kIsRecord = {std::is_same_v<Record, Records>...};
    std::size_t place = 0;
    while (!kIsRecord[place]) ++place;
    return static_cast<FeedbackKind>(place);
  }
};

// Every kind of feedback, by its record, which says the rest. Both families of a kind ("HV…" of the
// search model, "CZ…" of the messages) are one record. Of two records with one message the first is
// what the message is read as.
using FeedbackKinds = FeedbackList<
    // What clients report.
    struct HVVisibleResultsFeedback, struct HVStartNetworkSearchFeedback,
    struct HVEndNetworkSearchFeedback, struct HVStartLocalSearchFeedback,
    struct HVEndLocalSearchFeedback, struct HVSearchViewAppearFeedback,
    struct HVSearchViewDisappearFeedback, struct HVRankingFeedback, struct CZZLKRankerFeedback,
    struct HVResultEngagementFeedback, struct HVCardSectionEngagementFeedback,
    struct HVMapsCardSectionEngagementFeedback, struct HVStoreCardSectionEngagementFeedback,
    struct HVErrorFeedback, struct HVSuggestionEngagementFeedback,
    struct HVCardViewDisappearFeedback, struct HVStartSearchFeedback, struct HVEndSearchFeedback,
    struct HVVisibleSuggestionsFeedback, struct HVCustomFeedback,
    struct HVResultsReceivedAfterTimeoutFeedback, struct HVLateSectionsAppendedFeedback,
    struct HVClearInputFeedback, struct HVSectionEngagementFeedback,
    struct HVVisibleSectionHeaderFeedback, struct HVDidGoToSiteFeedback,
    struct HVDidGoToSearchFeedback, struct HVResultGradingFeedback,
    // What only the daemon makes.
    struct ZLKLookupStartNetworkSearchFeedback, struct ZLKEndNetworkSearchFeedback,
    struct ZLKSkipSearchFeedback, struct ZLKCacheHitFeedback, struct ZelkorSessionEndFeedback,
    struct ZelkorSessionMissingResults, struct ZelkorSessionMissingSuggestions,
    struct ZelkorConnectionInvalidated>;

template <typename Record>
inline constexpr FeedbackKind kKindOf = FeedbackKinds::kindOf<Record>();

}  // namespace zelkor
