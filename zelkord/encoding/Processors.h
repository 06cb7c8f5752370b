#pragma once

#include <optional>
#include <tuple>
#include <type_traits>
#include <utility>

#include "halvane/DaemonFeedback.h"
#include "halvane/ModelFeedback.h"
#include "zelkord/encoding/IdentifierProcessor.h"

namespace zelkord {

// Replaces the identifiers of items that are described in full; whether there were any.
bool processExpanded(HVSearchResult& result, IdentifierProcessor& processor);
bool processExpanded(HVSuggestion& suggestion, IdentifierProcessor& processor);

// Everything else has no identifier of its own, or holds items.
template <typename Value>
bool processExpanded(Value& value, IdentifierProcessor& processor);
template <typename Value>
bool processExpanded(std::optional<Value>& value, IdentifierProcessor& processor) {
  return value && processExpanded(*value, processor);
}
template <typename Record>
bool processExpanded(Packed<Record>& packed, IdentifierProcessor& processor) {
  if (!packed) return false;
  auto record = *packed;
  const bool replaced = processExpanded(record, processor);
  if (replaced) packed = record;
  return replaced;
}
template <typename Item>
bool processExpanded(PackedList<Item>& items, IdentifierProcessor& processor) {
  bool replaced = false;
  PackedList<Item> processed;
  for (auto item : items) {
    replaced |= processExpanded(item, processor);
    processed.push_back(item);
  }
  if (replaced) items = std::move(processed);
  return replaced;
}

// Whether there may be items in what is sent of such a value.
template <typename Value>
constexpr bool mayHoldItems() {
  if constexpr (std::is_same_v<Value, HVSearchResult> || std::is_same_v<Value, HVSuggestion>) {
    return true;
  } else if constexpr (requires { Value::fields(); }) {
    return std::apply(
        [](const auto&... field) {
          return ((field.use != FieldUse::StoredOnly && mayHoldItems<ValueOf<decltype(field)>>()) ||
                  ...);
        },
        Value::fields());
  } else if constexpr (requires { typename Value::value_type; }) {
    return mayHoldItems<typename Value::value_type>();
  } else {
    return false;
  }
}

// What is sent of a record describes its items in full, unless its kind is one of those below.
template <typename Record>
bool processItemsOf(Record& record, IdentifierProcessor& processor) {
  const auto processField = [&](const auto& field) {
    return field.use != FieldUse::StoredOnly && processExpanded(record.*field.member, processor);
  };
  bool replaced = false;
  std::apply([&](const auto&... field) { ((replaced |= processField(field)), ...); },
             Record::fields());
  return replaced;
}

// These only name the item.
template <typename Record>
inline constexpr bool kNamesAnItem = false;
template <>
inline constexpr bool kNamesAnItem<HVResultEngagementFeedback> = true;
template <>
inline constexpr bool kNamesAnItem<HVSuggestionEngagementFeedback> = true;
bool processItemsOf(HVResultEngagementFeedback& feedback, IdentifierProcessor& processor);
bool processItemsOf(HVSuggestionEngagementFeedback& feedback, IdentifierProcessor& processor);

template <typename Value>
bool processExpanded(Value& value, IdentifierProcessor& processor) {
  if constexpr (requires { Value::fields(); }) {
    return processItemsOf(value, processor);
  } else {
    return false;
  }
}

}  // namespace zelkord
