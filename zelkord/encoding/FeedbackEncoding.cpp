#include "zelkord/encoding/FeedbackEncoding.h"

#include <array>
#include <boost/json/parse.hpp>
#include <type_traits>

#include "zelkord/encoding/Encoders.h"
#include "zelkord/encoding/Processors.h"

namespace zelkord {
namespace {

// How the records of one kind are sent. The default is a kind that nobody gave an encoder.
struct KindEncoding {
  bool (*encode)(const HVFeedback& feedback, LeftOut leftOut, std::size_t begin,
                 std::string& text) = nullptr;
  bool (*process)(HVFeedback& feedback, IdentifierProcessor& processor) = nullptr;
};

template <typename T>
bool encode(const HVFeedback& feedback, [[maybe_unused]] LeftOut leftOut, std::size_t begin,
            std::string& text) {
  const auto& record = static_cast<const T&>(feedback);
  if constexpr (std::is_same_v<T, HVCustomFeedback>) {
    return appendMembersOf(record, leftOut, begin, text);
  } else {
    return appendMembersOf(record, begin, text);
  }
}

template <typename T>
bool process(HVFeedback& feedback, IdentifierProcessor& processor) {
  return processItemsOf(static_cast<T&>(feedback), processor);
}

// What the daemon itself says of results and suggestions has their replaced identifiers already.
template <typename T>
constexpr KindEncoding encodingOfKind() {
  constexpr bool kIsClients = T::kDescription.origin() == FeedbackOrigin::Client;
  if constexpr (kIsClients && (mayHoldItems<T>() || kNamesAnItem<T>)) {
    return {&encode<T>, &process<T>};
  } else {
    return {&encode<T>, nullptr};
  }
}

template <typename... Kinds>
constexpr std::array<KindEncoding, sizeof...(Kinds)> makeTable(FeedbackList<Kinds...>) {
  return {encodingOfKind<Kinds>()...};
}

const KindEncoding& encodingOf(const HVFeedback& feedback) {
  static constexpr auto kTable = makeTable(FeedbackKinds());
  static constexpr KindEncoding kGeneric;
  const auto index = static_cast<std::size_t>(feedback.kind());
  return index < kTable.size() ? kTable[index] : kGeneric;
}

}  // namespace

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
