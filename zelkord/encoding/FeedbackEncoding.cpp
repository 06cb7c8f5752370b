#include "zelkord/encoding/FeedbackEncoding.h"

#include <array>
#include <boost/json/parse.hpp>

#include "zelkord/encoding/Encoders.h"
#include "zelkord/encoding/Processors.h"

namespace zelkord {
namespace {

// How the records of one kind are sent. The default is a kind that nobody gave an encoder.
struct KindEncoding {
  std::uint32_t type = kGenericFeedbackType;
  bool requiresQueryId = true;
  bool (*encode)(const HVFeedback& feedback, LeftOut leftOut, std::size_t begin,
                 std::string& text) = nullptr;
  bool (*process)(HVFeedback& feedback, IdentifierProcessor& processor) = nullptr;
};

using KindTable = std::array<KindEncoding, kFeedbackKinds>;

template <typename T>
bool encode(const HVFeedback& feedback, [[maybe_unused]] LeftOut leftOut, std::size_t begin,
            std::string& text) {
  const auto& record = static_cast<const T&>(feedback);
  if constexpr (T::kKind == FeedbackKind::Custom) {
    return appendMembersOf(record, leftOut, begin, text);
  } else {
    return appendMembersOf(record, begin, text);
  }
}

template <typename T>
bool process(HVFeedback& feedback, IdentifierProcessor& processor) {
  return processItemsOf(static_cast<T&>(feedback), processor);
}

template <typename T>
constexpr void add(KindTable& table, std::uint32_t type, bool requiresQueryId = true) {
  table[static_cast<std::size_t>(T::kKind)] = {type, requiresQueryId, &encode<T>, nullptr};
}

// A kind whose records speak of results or suggestions.
template <typename T>
constexpr void addWithItems(KindTable& table, std::uint32_t type, bool requiresQueryId = true) {
  add<T>(table, type, requiresQueryId);
  table[static_cast<std::size_t>(T::kKind)].process = &process<T>;
}

constexpr KindTable makeTable() {
  KindTable table;
  addWithItems<HVVisibleResultsFeedback>(table, 0);
  add<HVStartNetworkSearchFeedback>(table, 1);
  add<ZLKLookupStartNetworkSearchFeedback>(table, 1);
  add<HVEndNetworkSearchFeedback>(table, 2, false);
  add<ZLKEndNetworkSearchFeedback>(table, 2, false);
  add<HVStartLocalSearchFeedback>(table, 3);
  add<HVEndLocalSearchFeedback>(table, 4, false);
  add<HVSearchViewAppearFeedback>(table, 5);
  add<HVSearchViewDisappearFeedback>(table, 6);
  addWithItems<HVRankingFeedback>(table, 7);
  addWithItems<CZZLKRankerFeedback>(table, 7);
  addWithItems<HVResultEngagementFeedback>(table, 8);
  add<HVCardSectionEngagementFeedback>(table, 10);
  add<HVMapsCardSectionEngagementFeedback>(table, 10);
  add<HVStoreCardSectionEngagementFeedback>(table, 10);
  add<HVErrorFeedback>(table, 11);
  addWithItems<HVSuggestionEngagementFeedback>(table, 12);
  add<HVCardViewDisappearFeedback>(table, 13);
  add<HVStartSearchFeedback>(table, 14);
  add<HVEndSearchFeedback>(table, 15);
  addWithItems<HVVisibleSuggestionsFeedback>(table, 16);
  add<HVCustomFeedback>(table, kGenericFeedbackType);  // the type is the record's own
  addWithItems<HVResultsReceivedAfterTimeoutFeedback>(table, 22);
  addWithItems<HVLateSectionsAppendedFeedback>(table, 23);
  add<HVClearInputFeedback>(table, 24);
  add<ZelkorSessionEndFeedback>(table, 25, false);
  add<ZLKSkipSearchFeedback>(table, 26);
  add<ZLKCacheHitFeedback>(table, 26);  // shared with the kind above
  add<HVSectionEngagementFeedback>(table, 27);
  add<HVVisibleSectionHeaderFeedback>(table, 28);
  add<ZelkorSessionMissingResults>(table, 29, false);
  add<ZelkorSessionMissingSuggestions>(table, 30, false);
  add<HVDidGoToSiteFeedback>(table, 31);
  add<ZelkorConnectionInvalidated>(table, 32, false);
  addWithItems<HVResultGradingFeedback>(table, 33, false);
  add<HVDidGoToSearchFeedback>(table, 34);
  return table;
}

const KindEncoding& encodingOf(const HVFeedback& feedback) {
  static constexpr auto kTable = makeTable();
  static constexpr KindEncoding kGeneric;
  const auto index = static_cast<std::size_t>(feedback.kind());
  return index < kTable.size() ? kTable[index] : kGeneric;
}

// By custom type.
constexpr std::array<std::uint32_t, 4> kCustomFeedbackTypes = {17, 19, 18, 20};
constexpr std::uint32_t kCustomLantheResultFeatures = 20;

}  // namespace

std::uint32_t typeOf(const HVFeedback& feedback) {
  if (const auto* custom = feedback.kind() == FeedbackKind::Custom
                               ? static_cast<const HVCustomFeedback*>(&feedback)
                               : nullptr) {
    ZK_CHECK(custom->feedbackType.isKnown(), "custom type out of range");
    return kCustomFeedbackTypes[static_cast<std::size_t>(custom->feedbackType.value)];
  }
  return encodingOf(feedback).type;
}

bool requiresQueryId(const HVFeedback& feedback) {
  return encodingOf(feedback).requiresQueryId && typeOf(feedback) != kCustomLantheResultFeatures;
}

bool appendMembers(const HVFeedback& feedback, const Logger& errors, std::size_t begin,
                   std::string& text, LeftOut leftOut) {
  const auto& encoding = encodingOf(feedback);
  if (!encoding.encode) {
    if (feedback.family == FeedbackFamily::Message) {
      errors.error("Feedback dictionary translation for {} fell back to default implementation.",
                   feedback.className());
    }
    return true;
  }
  const auto old = text.size();
  if (encoding.encode(feedback, leftOut, begin, text)) return true;
  text.resize(old);
  return false;
}

json::object dictionaryOf(const HVFeedback& feedback, const Logger& errors) {
  std::string text = "{";
  if (!appendMembers(feedback, errors, text.size(), text)) return {};
  text += '}';
  return valueOfOwnJson(text).as_object();
}

json::value valueOfOwnJson(std::string_view text) {
  json::parse_options options;
  options.max_depth = kMaximumJsonDepth + 8;
  json::error_code error;
  auto value = json::parse({text.data(), text.size()}, error, {}, options);
  return error ? json::value() : value;
}

std::shared_ptr<const HVFeedback> processed(std::shared_ptr<const HVFeedback> feedback,
                                            IdentifierProcessor& processor) {
  auto* const process = encodingOf(*feedback).process;
  if (!process) return feedback;
  auto copy = feedback->clone();
  if (process(*copy, processor)) return copy;
  return feedback;
}

}  // namespace zelkord
