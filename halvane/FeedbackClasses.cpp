#include "halvane/FeedbackClasses.h"

#include <algorithm>
#include <vector>

#include "halvane/DaemonFeedback.h"
#include "halvane/ModelFeedback.h"

namespace zelkor {
namespace {

template <typename T, FeedbackFamily Family>
std::unique_ptr<HVFeedback> make() {
  auto feedback = std::make_unique<T>();
  feedback->family = Family;
  return feedback;
}

bool hasName(const std::vector<FeedbackClass>& classes, std::string_view name) {
  return std::any_of(classes.begin(), classes.end(),
                     [name](const auto& known) { return known.name == name; });
}

// Adds a kind's classes; a message class that is there already stays as it is.
template <typename T>
void addClasses(std::vector<FeedbackClass>& classes, FeedbackOrigin origin) {
  using enum FeedbackFamily;
  if (!T::kName.empty()) classes.push_back({T::kName, Model, origin, &make<T, Model>});
  if (hasName(classes, T::kMessageName)) return;
  classes.push_back({T::kMessageName, Message, origin, &make<T, Message>});
}

template <typename... Kinds>
void addAll(std::vector<FeedbackClass>& classes, FeedbackOrigin origin) {
  (addClasses<Kinds>(classes, origin), ...);
}

std::vector<FeedbackClass> allClasses() {
  std::vector<FeedbackClass> classes;
  addAll<HVVisibleResultsFeedback, HVStartNetworkSearchFeedback, HVEndNetworkSearchFeedback,
         HVStartLocalSearchFeedback, HVEndLocalSearchFeedback, HVSearchViewAppearFeedback,
         HVSearchViewDisappearFeedback, HVRankingFeedback, CZZLKRankerFeedback,
         HVResultEngagementFeedback, HVCardSectionEngagementFeedback,
         HVMapsCardSectionEngagementFeedback, HVStoreCardSectionEngagementFeedback, HVErrorFeedback,
         HVSuggestionEngagementFeedback, HVCardViewDisappearFeedback, HVStartSearchFeedback,
         HVEndSearchFeedback, HVVisibleSuggestionsFeedback, HVCustomFeedback,
         HVResultsReceivedAfterTimeoutFeedback, HVLateSectionsAppendedFeedback,
         HVClearInputFeedback, HVSectionEngagementFeedback, HVVisibleSectionHeaderFeedback,
         HVDidGoToSiteFeedback, HVDidGoToSearchFeedback, HVResultGradingFeedback>(
      classes, FeedbackOrigin::Client);
  addAll<ZLKLookupStartNetworkSearchFeedback, ZLKEndNetworkSearchFeedback, ZLKSkipSearchFeedback,
         ZLKCacheHitFeedback, ZelkorSessionEndFeedback, ZelkorSessionMissingResults,
         ZelkorSessionMissingSuggestions, ZelkorConnectionInvalidated>(classes,
                                                                       FeedbackOrigin::Daemon);
  std::sort(classes.begin(), classes.end(),
            [](const auto& a, const auto& b) { return a.name < b.name; });
  return classes;
}

}  // namespace

const FeedbackClass* feedbackClassNamed(std::string_view name) {
  static const auto classes = allClasses();
  const auto found =
      std::lower_bound(classes.begin(), classes.end(), name,
                       [](const auto& known, std::string_view text) { return known.name < text; });
  return found != classes.end() && found->name == name ? &*found : nullptr;
}

std::unique_ptr<HVFeedback> readFeedback(const FeedbackClass& feedbackClass,
                                         std::string_view message, RecordFault& fault) {
  auto feedback = feedbackClass.make();
  RecordReader reader(message);
  const bool good = feedback->read(reader);
  fault = reader.fault();
  return good ? std::move(feedback) : nullptr;
}

}  // namespace zelkor
