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
void expand(Item& item, IdentifierProcessor& processor) {
  if (const auto identifier = replaceIdentifier(item, processor)) {
    processor.identifierExpanded(*identifier);
  }
}

}  // namespace

void processExpanded(HVSearchResult& result, IdentifierProcessor& processor) {
  expand(result, processor);
}

void processExpanded(HVSuggestion& suggestion, IdentifierProcessor& processor) {
  expand(suggestion, processor);
}

void processItemsOf(HVResultEngagementFeedback& feedback, IdentifierProcessor& processor) {
  if (!feedback.result) return;
  if (const auto identifier = replaceIdentifier(*feedback.result, processor)) {
    processor.identifierReferencedForResult(*identifier, *feedback.result);
  }
}

void processItemsOf(HVSuggestionEngagementFeedback& feedback, IdentifierProcessor& processor) {
  if (!feedback.suggestion) return;
  if (const auto identifier = replaceIdentifier(*feedback.suggestion, processor)) {
    processor.identifierReferencedForSuggestion(*identifier, *feedback.suggestion);
  }
}

}  // namespace zelkord
