#pragma once

#include <optional>
#include <string>

#include "halvane/FeedbackRecord.h"
#include "halvane/Results.h"

namespace zelkor {

// What the user does with what a client shows.

// The user did something with a result. Its engagement type is its result's type; a top hit is a
// result whose `topHit` is not 0.
struct HVResultEngagementFeedback final : FeedbackRecord<HVResultEngagementFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVResultEngagementFeedback", 8};

  Term<vocabulary::kEventTypes> triggerEvent;
  Term<vocabulary::kDestinationTypes> destination;
  Packed<HVSearchResult> result;
  bool actionEngaged = false;
  Term<vocabulary::kActionTargetTypes> actionTarget;
  std::optional<std::string> completedQuery;

  static constexpr auto fields() {
    using T = HVResultEngagementFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent),
                      sent(3, "destination", &T::destination),
                      stored(4, "result", &T::result),
                      stored(5, "action_engaged", &T::actionEngaged),
                      stored(6, "action_target", &T::actionTarget),
                      stored(7, "completed_query", &T::completedQuery)};
  }
};

struct HVSectionEngagementFeedback final : FeedbackRecord<HVSectionEngagementFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVSectionEngagementFeedback", 27};

  std::optional<std::string> identifier;
  Term<vocabulary::kSectionEngagementEvents> triggerEvent;
  Packed<HVResultSection> section;

  static constexpr auto fields() {
    using T = HVSectionEngagementFeedback;
    return std::tuple{sent(2, "id", &T::identifier), sent(3, "trigger_event", &T::triggerEvent),
                      stored(4, "section", &T::section)};
  }
};

struct HVSuggestionEngagementFeedback final : FeedbackRecord<HVSuggestionEngagementFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVSuggestionEngagementFeedback", 12};

  Packed<HVSuggestion> suggestion;

  static constexpr auto fields() {
    return std::tuple{stored(2, "suggestion", &HVSuggestionEngagementFeedback::suggestion)};
  }
};

struct HVCardSectionEngagementFeedback final : FeedbackRecord<HVCardSectionEngagementFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVCardSectionEngagementFeedback", 10};

  Term<vocabulary::kCardSectionEvents> triggerEvent;
  Term<vocabulary::kCardTypes> cardType;
  Term<vocabulary::kCardActionTargets> actionTarget;
  std::optional<std::string> actionDestination;

  static constexpr auto fields() {
    using T = HVCardSectionEngagementFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent),
                      sent(3, "card_type", &T::cardType),
                      sent(4, "action_target", &T::actionTarget),
                      sent(5, "action_destination", &T::actionDestination)};
  }
};

struct HVMapsCardSectionEngagementFeedback final
    : FeedbackRecord<HVMapsCardSectionEngagementFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVMapsCardSectionEngagementFeedback", 10};

  Term<vocabulary::kMapsFeedbackTypes> feedbackType;

  static constexpr auto fields() {
    return std::tuple{
        stored(2, "feedback_type", &HVMapsCardSectionEngagementFeedback::feedbackType)};
  }
};

struct HVStoreCardSectionEngagementFeedback final
    : FeedbackRecord<HVStoreCardSectionEngagementFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVStoreCardSectionEngagementFeedback", 10};

  Term<vocabulary::kProductPageResults> productPageResult;

  static constexpr auto fields() {
    return std::tuple{
        stored(2, "product_page_result", &HVStoreCardSectionEngagementFeedback::productPageResult)};
  }
};

struct HVDidGoToSiteFeedback final : FeedbackRecord<HVDidGoToSiteFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVDidGoToSiteFeedback", 31};

  std::optional<std::string> input;

  static constexpr auto fields() {
    return std::tuple{sent(2, "input", &HVDidGoToSiteFeedback::input)};
  }
};

struct HVDidGoToSearchFeedback final : FeedbackRecord<HVDidGoToSearchFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVDidGoToSearchFeedback", 34};

  std::optional<std::string> input;
  Term<vocabulary::kEndpointTypes> endpointType;

  static constexpr auto fields() {
    using T = HVDidGoToSearchFeedback;
    return std::tuple{sent(2, "input", &T::input), sent(3, "endpoint_type", &T::endpointType)};
  }
};

struct HVResultGradingFeedback final : FeedbackRecord<HVResultGradingFeedback> {
  static constexpr FeedbackDescription kDescription = {"HVResultGradingFeedback", 33,
                                                       QueryIds::None};

  Term<vocabulary::kResultGrades> grade;
  Packed<HVSearchResult> result;
  std::optional<std::string> textFeedback;  // sent by the message family only

  static constexpr auto fields() {
    using T = HVResultGradingFeedback;
    return std::tuple{sent(2, "grade", &T::grade), sent(3, "result", &T::result),
                      stored(4, "text_feedback", &T::textFeedback)};
  }
};

}  // namespace zelkor
