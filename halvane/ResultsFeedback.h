#pragma once

#include <optional>
#include <string>

#include "halvane/FeedbackRecord.h"
#include "halvane/Results.h"

namespace zelkor {

// What a client shows, and how it came to that.

struct HVVisibleResultsFeedback final : FeedbackRecord<HVVisibleResultsFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVVisibleResultsFeedback", 0};

  Term<vocabulary::kVisibleResultsEvents> triggerEvent;
  PackedList<HVSearchResult> results;

  static constexpr auto fields() {
    using T = HVVisibleResultsFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent), sent(3, "results", &T::results)};
  }
};

struct HVVisibleSuggestionsFeedback final : FeedbackRecord<HVVisibleSuggestionsFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVVisibleSuggestionsFeedback", 16};

  PackedList<HVSuggestion> suggestions;
  std::optional<std::string> suggestionQuery;

  static constexpr auto fields() {
    using T = HVVisibleSuggestionsFeedback;
    return std::tuple{sent(2, "suggestions", &T::suggestions),
                      sent(3, "suggestion_query", &T::suggestionQuery)};
  }
};

struct HVVisibleSectionHeaderFeedback final : FeedbackRecord<HVVisibleSectionHeaderFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVVisibleSectionHeaderFeedback", 28};

  std::optional<std::string> sectionIdentifier;
  Term<vocabulary::kHeaderTypes> headerType;
  Packed<HVResultSection> section;

  static constexpr auto fields() {
    using T = HVVisibleSectionHeaderFeedback;
    return std::tuple{sent(2, "section_id", &T::sectionIdentifier),
                      sent(3, "section_header_type", &T::headerType),
                      stored(4, "section", &T::section)};
  }
};

// How the client ordered what it shows.
struct SectionsRanking {
  std::optional<double> blendingDuration;
  PackedList<HVSectionRanking> sections;

  static constexpr auto rankingFields() {
    using T = SectionsRanking;
    return std::tuple{sent(2, "blending_duration", &T::blendingDuration),
                      sent(3, "sections", &T::sections)};
  }
};

struct HVRankingFeedback final : FeedbackRecord<HVRankingFeedback>, SectionsRanking {
  static constexpr FeedbackDescription kDescription = {"HVRankingFeedback", 7};

  static constexpr auto fields() { return rankingFields(); }
};

// The same by the ranker. Exists as a message only.
struct CZZLKRankerFeedback final : FeedbackRecord<CZZLKRankerFeedback>, SectionsRanking {
  static constexpr FeedbackDescription kDescription = {"CZZLKRankerFeedback", 7};

  bool rankerDidRank = false;
  bool rankerTimeout = false;
  PackedList<HVSearchResult> rankerResults;
  std::optional<double> rankerDuration;

  static constexpr auto fields() {
    using T = CZZLKRankerFeedback;
    return std::tuple_cat(rankingFields(),
                          std::tuple{sent(4, "ranker_did_rank", &T::rankerDidRank),
                                     sent(5, "ranker_timeout", &T::rankerTimeout),
                                     sent(6, "ranker_results", &T::rankerResults),
                                     sent(7, "ranker_duration", &T::rankerDuration)});
  }
};

struct HVResultsReceivedAfterTimeoutFeedback final
    : FeedbackRecord<HVResultsReceivedAfterTimeoutFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVResultsReceivedAfterTimeoutFeedback", 22};

  PackedList<HVSearchResult> results;

  static constexpr auto fields() {
    return std::tuple{sent(2, "results", &HVResultsReceivedAfterTimeoutFeedback::results)};
  }
};

struct HVLateSectionsAppendedFeedback final : FeedbackRecord<HVLateSectionsAppendedFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVLateSectionsAppendedFeedback", 23};

  PackedList<HVResultSection> sections;

  static constexpr auto fields() {
    return std::tuple{sent(2, "sections", &HVLateSectionsAppendedFeedback::sections)};
  }
};

}  // namespace zelkor
