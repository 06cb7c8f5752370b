#include "zelkord/encoding/Processors.h"

namespace zelkord {
namespace {

// Puts the replacement in the place of an item's identifier, which it returns. None, and nothing
// done, for an item without one.
template <typename Item>
std::optional<std::string> replaceIdentifier(Item& item, IdentifierProcessor& processor) {
  if (!item.identifier || item.identifier->empty()) return std::nullopt;
  auto replacement = processor.replacementForIdentifier(*item.identifier);
  return std::exchange(item.identifier, std::move(replacement));
}

template <typename Item>
bool expand(Item& item, IdentifierProcessor& processor) {
  const auto identifier = replaceIdentifier(item, processor);
  if (identifier) processor.identifierExpanded(*identifier);
  return identifier.has_value();
}

}  // namespace

bool processExpanded(HVSearchResult& result, IdentifierProcessor& processor) {
  return expand(result, processor);
}

bool processExpanded(HVSuggestion& suggestion, IdentifierProcessor& processor) {
  return expand(suggestion, processor);
}

bool processItemsOf(HVResultEngagementFeedback& feedback, IdentifierProcessor& processor) {
  if (!feedback.result) return false;
  auto result = *feedback.result;
  const auto identifier = replaceIdentifier(result, processor);
  if (!identifier) return false;
  feedback.result = result;
  processor.identifierReferencedForResult(*identifier, result);
  return true;
}

bool processItemsOf(HVSuggestionEngagementFeedback& feedback, IdentifierProcessor& processor) {
  if (!feedback.suggestion) return false;
  auto suggestion = *feedback.suggestion;
  const auto identifier = replaceIdentifier(suggestion, processor);
  if (!identifier) return false;
  feedback.suggestion = suggestion;
  processor.identifierReferencedForSuggestion(*identifier, suggestion);
  return true;
}

}  // namespace zelkord
