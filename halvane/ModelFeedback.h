#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "halvane/FeedbackRecord.h"
#include "halvane/Results.h"

namespace zelkor {

// The feedback that clients send, and that the daemon makes of its own requests. Each record has
// the fields of its message, whose numbers and meanings corezelkor/proto/Feedback.proto fixes.

using StringMap = std::map<std::string, std::string>;

struct HVVisibleResultsFeedback final : FeedbackRecord<HVVisibleResultsFeedback> {
  static constexpr auto kKind = FeedbackKind::VisibleResults;
  static constexpr std::string_view kName = "HVVisibleResultsFeedback";
  static constexpr std::string_view kMessageName = "CZVisibleResultsFeedback";

  Term<vocabulary::kVisibleResultsEvents> triggerEvent;
  PackedList<HVSearchResult> results;

  static constexpr auto fields() {
    using T = HVVisibleResultsFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent), sent(3, "results", &T::results)};
  }
};

// What the start of any request to the service has.
struct NetworkSearchStart {
  Term<vocabulary::kSearchRequestTriggers> triggerEvent;
  std::optional<std::string> input;
  std::optional<std::string> uuid;
  StringMap headers;
  std::optional<std::string> url;
  Term<vocabulary::kEndpointTypes> endpointType;
};

// A request to the service went out.
struct HVStartNetworkSearchFeedback final : FeedbackRecord<HVStartNetworkSearchFeedback>,
                                            NetworkSearchStart {
  static constexpr auto kKind = FeedbackKind::StartNetworkSearch;
  static constexpr std::string_view kName = "HVStartNetworkSearchFeedback";
  static constexpr std::string_view kMessageName = "CZStartNetworkSearchFeedback";

  static constexpr auto fields() {
    using T = NetworkSearchStart;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent),
                      sent(3, "input", &T::input),
                      sent(4, "uuid", &T::uuid),
                      sent(5, "headers", &T::headers),
                      sent(6, "url", &T::url),
                      sent(7, "endpoint_type", &T::endpointType)};
  }
};

// What the end of any request to the service has.
struct NetworkSearchEnd {
  std::int64_t responseSize = 0;  // bytes
  std::int32_t statusCode = 0;
  std::optional<JsonObjectText> networkTimingData;
  std::optional<bool> connectionReused;
  std::optional<std::string> interface;
  std::optional<std::string> peerAddress;  // "[ADDRESS]:PORT" or "ADDRESS:PORT"
  std::optional<std::string> uuid;         // the start's

  static constexpr auto endFields() {
    using T = NetworkSearchEnd;
    return std::tuple{sent(2, "response_size", &T::responseSize),
                      sent(3, "status_code", &T::statusCode),
                      sent(4, "network_timing_data", &T::networkTimingData),
                      sent(5, "connection_reused", &T::connectionReused),
                      sent(6, "interface", &T::interface),
                      sent(7, "peer_address", &T::peerAddress),
                      sent(8, "uuid", &T::uuid)};
  }
};

// ... and its answer came, or none did.
struct HVEndNetworkSearchFeedback final : FeedbackRecord<HVEndNetworkSearchFeedback>,
                                          NetworkSearchEnd {
  static constexpr auto kKind = FeedbackKind::EndNetworkSearch;
  static constexpr std::string_view kName = "HVEndNetworkSearchFeedback";
  static constexpr std::string_view kMessageName = "CZEndNetworkSearchFeedback";

  static constexpr auto fields() { return endFields(); }
};

struct HVStartLocalSearchFeedback final : FeedbackRecord<HVStartLocalSearchFeedback> {
  static constexpr auto kKind = FeedbackKind::StartLocalSearch;
  static constexpr std::string_view kName = "HVStartLocalSearchFeedback";
  static constexpr std::string_view kMessageName = "CZStartLocalSearchFeedback";

  Term<vocabulary::kSearchRequestTriggers> triggerEvent;
  std::optional<std::string> input;
  std::optional<std::string> uuid;
  Term<vocabulary::kIndexTypes> indexType;

  static constexpr auto fields() {
    using T = HVStartLocalSearchFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent), sent(3, "input", &T::input),
                      sent(4, "uuid", &T::uuid), sent(5, "index_type", &T::indexType)};
  }
};

struct HVEndLocalSearchFeedback final : FeedbackRecord<HVEndLocalSearchFeedback> {
  static constexpr auto kKind = FeedbackKind::EndLocalSearch;
  static constexpr std::string_view kName = "HVEndLocalSearchFeedback";
  static constexpr std::string_view kMessageName = "CZEndLocalSearchFeedback";

  std::optional<std::string> uuid;

  static constexpr auto fields() {
    return std::tuple{sent(2, "uuid", &HVEndLocalSearchFeedback::uuid)};
  }
};

struct HVSearchViewAppearFeedback final : FeedbackRecord<HVSearchViewAppearFeedback> {
  static constexpr auto kKind = FeedbackKind::SearchViewAppear;
  static constexpr std::string_view kName = "HVSearchViewAppearFeedback";
  static constexpr std::string_view kMessageName = "CZSearchViewAppearFeedback";

  Term<vocabulary::kViewAppearEvents> triggerEvent;
  bool onLockScreen = false;
  bool isOverApp = false;

  static constexpr auto fields() {
    using T = HVSearchViewAppearFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent),
                      sent(3, "on_lock_screen", &T::onLockScreen),
                      sent(4, "is_over_app", &T::isOverApp)};
  }
};

struct HVSearchViewDisappearFeedback final : FeedbackRecord<HVSearchViewDisappearFeedback> {
  static constexpr auto kKind = FeedbackKind::SearchViewDisappear;
  static constexpr std::string_view kName = "HVSearchViewDisappearFeedback";
  static constexpr std::string_view kMessageName = "CZSearchViewDisappearFeedback";

  Term<vocabulary::kViewDisappearEvents> triggerEvent;

  static constexpr auto fields() {
    return std::tuple{sent(2, "trigger_event", &HVSearchViewDisappearFeedback::triggerEvent)};
  }
};

// How the client ordered what it shows.
struct SectionsRanking {
  std::optional<double> blendingDuration;
  PackedList<HVSectionRanking> sections;
};

struct HVRankingFeedback final : FeedbackRecord<HVRankingFeedback>, SectionsRanking {
  static constexpr auto kKind = FeedbackKind::Ranking;
  static constexpr std::string_view kName = "HVRankingFeedback";
  static constexpr std::string_view kMessageName = "CZRankingFeedback";

  static constexpr auto fields() {
    return std::tuple{sent(2, "blending_duration", &SectionsRanking::blendingDuration),
                      sent(3, "sections", &SectionsRanking::sections)};
  }
};

// The same by the ranker. Exists as a message only.
struct CZZLKRankerFeedback final : FeedbackRecord<CZZLKRankerFeedback>, SectionsRanking {
  static constexpr auto kKind = FeedbackKind::Ranker;
  static constexpr std::string_view kName = "";
  static constexpr std::string_view kMessageName = "CZZLKRankerFeedback";

  bool rankerDidRank = false;
  bool rankerTimeout = false;
  PackedList<HVSearchResult> rankerResults;
  std::optional<double> rankerDuration;

  static constexpr auto fields() {
    using T = CZZLKRankerFeedback;
    return std::tuple{sent(2, "blending_duration", &SectionsRanking::blendingDuration),
                      sent(3, "sections", &SectionsRanking::sections),
                      sent(4, "ranker_did_rank", &T::rankerDidRank),
                      sent(5, "ranker_timeout", &T::rankerTimeout),
                      sent(6, "ranker_results", &T::rankerResults),
                      sent(7, "ranker_duration", &T::rankerDuration)};
  }
};

// The user did something with a result. Its engagement type is its result's type; a top hit is a
// result whose `topHit` is not 0.
struct HVResultEngagementFeedback final : FeedbackRecord<HVResultEngagementFeedback> {
  static constexpr auto kKind = FeedbackKind::ResultEngagement;
  static constexpr std::string_view kName = "HVResultEngagementFeedback";
  static constexpr std::string_view kMessageName = "CZResultEngagementFeedback";

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

struct HVCardSectionEngagementFeedback final : FeedbackRecord<HVCardSectionEngagementFeedback> {
  static constexpr auto kKind = FeedbackKind::CardSectionEngagement;
  static constexpr std::string_view kName = "HVCardSectionEngagementFeedback";
  static constexpr std::string_view kMessageName = "CZCardSectionEngagementFeedback";

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
  static constexpr auto kKind = FeedbackKind::MapsCardSectionEngagement;
  static constexpr std::string_view kName = "HVMapsCardSectionEngagementFeedback";
  static constexpr std::string_view kMessageName = "CZMapsCardSectionEngagementFeedback";

  Term<vocabulary::kMapsFeedbackTypes> feedbackType;

  static constexpr auto fields() {
    return std::tuple{
        stored(2, "feedback_type", &HVMapsCardSectionEngagementFeedback::feedbackType)};
  }
};

struct HVStoreCardSectionEngagementFeedback final
    : FeedbackRecord<HVStoreCardSectionEngagementFeedback> {
  static constexpr auto kKind = FeedbackKind::StoreCardSectionEngagement;
  static constexpr std::string_view kName = "HVStoreCardSectionEngagementFeedback";
  static constexpr std::string_view kMessageName = "CZStoreCardSectionEngagementFeedback";

  Term<vocabulary::kProductPageResults> productPageResult;

  static constexpr auto fields() {
    return std::tuple{
        stored(2, "product_page_result", &HVStoreCardSectionEngagementFeedback::productPageResult)};
  }
};

struct HVSuggestionEngagementFeedback final : FeedbackRecord<HVSuggestionEngagementFeedback> {
  static constexpr auto kKind = FeedbackKind::SuggestionEngagement;
  static constexpr std::string_view kName = "HVSuggestionEngagementFeedback";
  static constexpr std::string_view kMessageName = "CZSuggestionEngagementFeedback";

  Packed<HVSuggestion> suggestion;

  static constexpr auto fields() {
    return std::tuple{stored(2, "suggestion", &HVSuggestionEngagementFeedback::suggestion)};
  }
};

struct HVCardViewDisappearFeedback final : FeedbackRecord<HVCardViewDisappearFeedback> {
  static constexpr auto kKind = FeedbackKind::CardViewDisappear;
  static constexpr std::string_view kName = "HVCardViewDisappearFeedback";
  static constexpr std::string_view kMessageName = "CZCardViewDisappearFeedback";

  Term<vocabulary::kCardViewDisappearEvents> triggerEvent;

  static constexpr auto fields() {
    return std::tuple{sent(2, "trigger_event", &HVCardViewDisappearFeedback::triggerEvent)};
  }
};

struct HVStartSearchFeedback final : FeedbackRecord<HVStartSearchFeedback> {
  static constexpr auto kKind = FeedbackKind::StartSearch;
  static constexpr std::string_view kName = "HVStartSearchFeedback";
  static constexpr std::string_view kMessageName = "CZStartSearchFeedback";

  Term<vocabulary::kSearchRequestTriggers> triggerEvent;
  std::optional<std::string> input;
  std::optional<std::string> uuid;

  static constexpr auto fields() {
    using T = HVStartSearchFeedback;
    return std::tuple{sent(2, "trigger_event", &T::triggerEvent), sent(3, "input", &T::input),
                      sent(4, "uuid", &T::uuid)};
  }
};

struct HVEndSearchFeedback final : FeedbackRecord<HVEndSearchFeedback> {
  static constexpr auto kKind = FeedbackKind::EndSearch;
  static constexpr std::string_view kName = "HVEndSearchFeedback";
  static constexpr std::string_view kMessageName = "CZEndSearchFeedback";

  std::optional<std::string> uuid;

  static constexpr auto fields() { return std::tuple{sent(2, "uuid", &HVEndSearchFeedback::uuid)}; }
};

struct HVVisibleSuggestionsFeedback final : FeedbackRecord<HVVisibleSuggestionsFeedback> {
  static constexpr auto kKind = FeedbackKind::VisibleSuggestions;
  static constexpr std::string_view kName = "HVVisibleSuggestionsFeedback";
  static constexpr std::string_view kMessageName = "CZVisibleSuggestionsFeedback";

  PackedList<HVSuggestion> suggestions;
  std::optional<std::string> suggestionQuery;

  static constexpr auto fields() {
    using T = HVVisibleSuggestionsFeedback;
    return std::tuple{sent(2, "suggestions", &T::suggestions),
                      sent(3, "suggestion_query", &T::suggestionQuery)};
  }
};

// Feedback whose form is the client's own.
struct HVCustomFeedback final : FeedbackRecord<HVCustomFeedback> {
  static constexpr auto kKind = FeedbackKind::Custom;
  static constexpr std::string_view kName = "HVCustomFeedback";
  static constexpr std::string_view kMessageName = "CZCustomFeedback";

  Term<vocabulary::kCustomTypes> feedbackType;
  std::string jsonFeedback;  // a JSON object, sent as it is

  static constexpr auto fields() {
    using T = HVCustomFeedback;
    return std::tuple{stored(2, "feedback_type", &T::feedbackType),
                      stored(3, "json_feedback", &T::jsonFeedback)};
  }
};

struct HVResultsReceivedAfterTimeoutFeedback final
    : FeedbackRecord<HVResultsReceivedAfterTimeoutFeedback> {
  static constexpr auto kKind = FeedbackKind::ResultsReceivedAfterTimeout;
  static constexpr std::string_view kName = "HVResultsReceivedAfterTimeoutFeedback";
  static constexpr std::string_view kMessageName = "CZResultsReceivedAfterTimeoutFeedback";

  PackedList<HVSearchResult> results;

  static constexpr auto fields() {
    return std::tuple{sent(2, "results", &HVResultsReceivedAfterTimeoutFeedback::results)};
  }
};

struct HVLateSectionsAppendedFeedback final : FeedbackRecord<HVLateSectionsAppendedFeedback> {
  static constexpr auto kKind = FeedbackKind::LateSectionsAppended;
  static constexpr std::string_view kName = "HVLateSectionsAppendedFeedback";
  static constexpr std::string_view kMessageName = "CZLateSectionsAppendedFeedback";

  PackedList<HVResultSection> sections;

  static constexpr auto fields() {
    return std::tuple{sent(2, "sections", &HVLateSectionsAppendedFeedback::sections)};
  }
};

struct HVClearInputFeedback final : FeedbackRecord<HVClearInputFeedback> {
  static constexpr auto kKind = FeedbackKind::ClearInput;
  static constexpr std::string_view kName = "HVClearInputFeedback";
  static constexpr std::string_view kMessageName = "CZClearInputFeedback";

  Term<vocabulary::kClearInputEvents> triggerEvent;

  static constexpr auto fields() {
    return std::tuple{sent(2, "trigger_event", &HVClearInputFeedback::triggerEvent)};
  }
};

struct HVSectionEngagementFeedback final : FeedbackRecord<HVSectionEngagementFeedback> {
  static constexpr auto kKind = FeedbackKind::SectionEngagement;
  static constexpr std::string_view kName = "HVSectionEngagementFeedback";
  static constexpr std::string_view kMessageName = "CZSectionEngagementFeedback";

  std::optional<std::string> identifier;
  Term<vocabulary::kSectionEngagementEvents> triggerEvent;
  Packed<HVResultSection> section;

  static constexpr auto fields() {
    using T = HVSectionEngagementFeedback;
    return std::tuple{sent(2, "id", &T::identifier), sent(3, "trigger_event", &T::triggerEvent),
                      stored(4, "section", &T::section)};
  }
};

struct HVVisibleSectionHeaderFeedback final : FeedbackRecord<HVVisibleSectionHeaderFeedback> {
  static constexpr auto kKind = FeedbackKind::VisibleSectionHeader;
  static constexpr std::string_view kName = "HVVisibleSectionHeaderFeedback";
  static constexpr std::string_view kMessageName = "CZVisibleSectionHeaderFeedback";

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

struct HVDidGoToSiteFeedback final : FeedbackRecord<HVDidGoToSiteFeedback> {
  static constexpr auto kKind = FeedbackKind::DidGoToSite;
  static constexpr std::string_view kName = "HVDidGoToSiteFeedback";
  static constexpr std::string_view kMessageName = "CZDidGoToSiteFeedback";

  std::optional<std::string> input;

  static constexpr auto fields() {
    return std::tuple{sent(2, "input", &HVDidGoToSiteFeedback::input)};
  }
};

struct HVDidGoToSearchFeedback final : FeedbackRecord<HVDidGoToSearchFeedback> {
  static constexpr auto kKind = FeedbackKind::DidGoToSearch;
  static constexpr std::string_view kName = "HVDidGoToSearchFeedback";
  static constexpr std::string_view kMessageName = "CZDidGoToSearchFeedback";

  std::optional<std::string> input;
  Term<vocabulary::kEndpointTypes> endpointType;

  static constexpr auto fields() {
    using T = HVDidGoToSearchFeedback;
    return std::tuple{sent(2, "input", &T::input), sent(3, "endpoint_type", &T::endpointType)};
  }
};

struct HVResultGradingFeedback final : FeedbackRecord<HVResultGradingFeedback> {
  static constexpr auto kKind = FeedbackKind::ResultGrading;
  static constexpr std::string_view kName = "HVResultGradingFeedback";
  static constexpr std::string_view kMessageName = "CZResultGradingFeedback";

  Term<vocabulary::kResultGrades> grade;
  Packed<HVSearchResult> result;
  std::optional<std::string> textFeedback;  // sent by the message family only

  static constexpr auto fields() {
    using T = HVResultGradingFeedback;
    return std::tuple{sent(2, "grade", &T::grade), sent(3, "result", &T::result),
                      stored(4, "text_feedback", &T::textFeedback)};
  }
};

struct HVErrorFeedback final : FeedbackRecord<HVErrorFeedback> {
  static constexpr auto kKind = FeedbackKind::Error;
  static constexpr std::string_view kName = "HVErrorFeedback";
  static constexpr std::string_view kMessageName = "CZErrorFeedback";

  HVErrorFeedback() = default;
  explicit HVErrorFeedback(HVError failure) : error(std::move(failure)) {}

  std::optional<HVError> error;
  std::optional<HVError> underlyingError;

  static constexpr auto fields() {
    using T = HVErrorFeedback;
    return std::tuple{sent(2, "error", &T::error),
                      sent(3, "underlying_error", &T::underlyingError)};
  }
};

}  // namespace zelkor
