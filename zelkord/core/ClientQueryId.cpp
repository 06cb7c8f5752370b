#include "zelkord/core/ClientQueryId.h"

#include "halvane/ModelFeedback.h"

namespace zelkord {
namespace {

using MaybeResult = std::optional<HVSearchResult>;

MaybeResult firstIn(const PackedList<HVSearchResult>& results) {
  return results.empty() ? std::nullopt : MaybeResult(results.front());
}

MaybeResult firstIn(const Packed<HVSearchResult>& result) {
  return result ? MaybeResult(*result) : std::nullopt;
}

MaybeResult firstIn(const Packed<HVResultSection>& section) {
  return section ? firstIn(section->results) : std::nullopt;
}

MaybeResult firstIn(const PackedList<HVResultSection>& sections) {
  for (const auto section : sections) {
    if (!section.results.empty()) return section.results.front();
  }
  return std::nullopt;
}

// What was ranked goes before what the section holds otherwise.
MaybeResult firstIn(const PackedList<HVSectionRanking>& rankings) {
  for (const auto ranking : rankings) {
    for (const auto place : ranking.results) {
      if (place.result) return *place.result;
    }
    if (auto result = firstIn(ranking.section)) return result;
  }
  return std::nullopt;
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
      return std::nullopt;
  }
}

}  // namespace

std::uint64_t clientQueryIdOf(const HVFeedback& feedback) {
  const auto result = firstResultOf(feedback);
  return result ? result->queryId : 0;
}

}  // namespace zelkord
