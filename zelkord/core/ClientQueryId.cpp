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

MaybeResult firstResultOf(const HVFeedback& feedback) {
  if (const auto* f = feedbackAs<HVVisibleResultsFeedback>(feedback)) return firstIn(f->results);
  if (const auto* f = feedbackAs<HVRankingFeedback>(feedback)) return firstIn(f->sections);
  if (const auto* f = feedbackAs<CZZLKRankerFeedback>(feedback)) return firstIn(f->sections);
  if (const auto* f = feedbackAs<HVResultEngagementFeedback>(feedback)) return firstIn(f->result);
  if (const auto* f = feedbackAs<HVResultsReceivedAfterTimeoutFeedback>(feedback))
    return firstIn(f->results);
  if (const auto* f = feedbackAs<HVLateSectionsAppendedFeedback>(feedback))
    return firstIn(f->sections);
  if (const auto* f = feedbackAs<HVSectionEngagementFeedback>(feedback)) return firstIn(f->section);
  if (const auto* f = feedbackAs<HVVisibleSectionHeaderFeedback>(feedback))
    return firstIn(f->section);
  return std::nullopt;
}

}  // namespace

std::uint64_t clientQueryIdOf(const HVFeedback& feedback) {
  const auto result = firstResultOf(feedback);
  return result ? result->queryId : 0;
}

}  // namespace zelkord
