#pragma once

#include <optional>
#include <tuple>
#include <type_traits>
#include <vector>

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
template <typename Value>
bool processExpanded(std::vector<Value>& values, IdentifierProcessor& processor) {
  bool replaced = false;
  for (auto& value : values) replaced |= processExpanded(value, processor);
  return replaced;
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
