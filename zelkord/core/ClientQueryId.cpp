#include "zelkord/core/ClientQueryId.h"

#include "halvane/ModelFeedback.h"

namespace zelkord {
namespace {

using MaybeResult = const HVSearchResult*;

MaybeResult firstIn(const std::vector<HVSearchResult>& results) {
  return results.empty() ? nullptr : &results.front();
}

MaybeResult firstIn(const std::optional<HVSearchResult>& result) {
  return result ? &*result : nullptr;
}

MaybeResult firstIn(const std::optional<HVResultSection>& section) {
  return section ? firstIn(section->results) : nullptr;
}

MaybeResult firstIn(const std::vector<HVResultSection>& sections) {
  for (const auto& section : sections) {
    if (!section.results.empty()) return &section.results.front();
  }
  return nullptr;
}

// What was ranked goes before what the section holds otherwise.
MaybeResult firstIn(const std::vector<HVSectionRanking>& rankings) {
  for (const auto& ranking : rankings) {
    for (const auto& place : ranking.results) {
      if (place.result) return &*place.result;
    }
    if (const auto* result = firstIn(ranking.section)) return result;
  }
  return nullptr;
}

template <typename T>
const T& as(const HVFeedback& feedback) {
  return static_cast<const T&>(feedback);
}

MaybeResult firstResultOf(const HVFeedback& feedback) {
  switch (feedback.kind()) {
    case FeedbackKind::VisibleResults:
      return firstIn(as<HVVisibleResultsFeedback>(feedback).results);
    case FeedbackKind::Ranking:
      return firstIn(as<HVRankingFeedback>(feedback).sections);
    case FeedbackKind::Ranker:
      return firstIn(as<CZZLKRankerFeedback>(feedback).sections);
    case FeedbackKind::ResultEngagement:
      return firstIn(as<HVResultEngagementFeedback>(feedback).result);
    case FeedbackKind::ResultsReceivedAfterTimeout:
      return firstIn(as<HVResultsReceivedAfterTimeoutFeedback>(feedback).results);
    case FeedbackKind::LateSectionsAppended:
      return firstIn(as<HVLateSectionsAppendedFeedback>(feedback).sections);
    case FeedbackKind::SectionEngagement:
      return firstIn(as<HVSectionEngagementFeedback>(feedback).section);
    case FeedbackKind::VisibleSectionHeader:
      return firstIn(as<HVVisibleSectionHeaderFeedback>(feedback).section);
    default:
      return nullptr;
  }
}

}  // namespace

std::uint64_t clientQueryIdOf(const HVFeedback& feedback) {
  const auto* result = firstResultOf(feedback);
  return result ? result->queryId : 0;
}

}  // namespace zelkord
