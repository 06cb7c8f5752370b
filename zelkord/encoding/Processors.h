#pragma once

#include <optional>
#include <tuple>
#include <type_traits>
#include <vector>

#include "halvane/DaemonFeedback.h"
#include "halvane/ModelFeedback.h"
#include "zelkord/encoding/IdentifierProcessor.h"

namespace zelkord {

// Replaces the identifier of an item that is described in full.
void processExpanded(HVSearchResult& result, IdentifierProcessor& processor);
void processExpanded(HVSuggestion& suggestion, IdentifierProcessor& processor);

// Everything else has no identifier of its own, or holds items.
template <typename Value>
void processExpanded(Value& value, IdentifierProcessor& processor);
template <typename Value>
void processExpanded(std::optional<Value>& value, IdentifierProcessor& processor) {
  if (value) processExpanded(*value, processor);
}
template <typename Value>
void processExpanded(std::vector<Value>& values, IdentifierProcessor& processor) {
  for (auto& value : values) processExpanded(value, processor);
}

// What is sent of a record describes its items in full, unless its kind is one of those below.
template <typename Record>
void processItemsOf(Record& record, IdentifierProcessor& processor) {
  const auto processField = [&](const auto& field) {
    if (field.use != FieldUse::StoredOnly) processExpanded(record.*field.member, processor);
  };
  std::apply([&](const auto&... field) { (processField(field), ...); }, Record::fields());
}

// These only name the item.
void processItemsOf(HVResultEngagementFeedback& feedback, IdentifierProcessor& processor);
void processItemsOf(HVSuggestionEngagementFeedback& feedback, IdentifierProcessor& processor);

template <typename Value>
void processExpanded(Value& value, IdentifierProcessor& processor) {
  if constexpr (requires { Value::fields(); }) processItemsOf(value, processor);
}

}  // namespace zelkord
