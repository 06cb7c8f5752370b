#include "zelkord/feedback/SessionProcessingHelper.h"

#include <algorithm>
#include <vector>

namespace zelkord {

std::string SessionProcessingHelper::replacementForIdentifier(const std::string& identifier) {
  const auto [place, isNew] = privateIdMapping_.try_emplace(identifier);
  if (isNew) place->second = std::to_string(nextMappedId_++);
  return place->second;
}

template <typename Item>
void SessionProcessingHelper::_reference(Map<Item>& map, const std::string& identifier,
                                         const Item& item) {
  if (expandedIdSet_.contains(identifier)) return;
  const auto [place, isNew] = map.try_emplace(identifier, Referenced<Item>{references_, {}});
  if (!isNew) return;
  place->second.item = item;
  ++references_;
}

void SessionProcessingHelper::identifierReferencedForResult(const std::string& identifier,
                                                            const HVSearchResult& result) {
  _reference(idResultMap_, identifier, result);
}

void SessionProcessingHelper::identifierReferencedForSuggestion(const std::string& identifier,
                                                                const HVSuggestion& suggestion) {
  _reference(idSuggestionMap_, identifier, suggestion);
}

void SessionProcessingHelper::identifierExpanded(const std::string& identifier) {
  expandedIdSet_.insert(identifier);
  if (idResultMap_.erase(identifier) == 0) idSuggestionMap_.erase(identifier);
}

template <typename Item>
PackedList<Item> SessionProcessingHelper::_inOrder(const Map<Item>& map) {
  std::vector<const Referenced<Item>*> referenced;
  for (const auto& entry : map) referenced.push_back(&entry.second);
  std::sort(referenced.begin(), referenced.end(),
            [](const auto* a, const auto* b) { return a->order < b->order; });
  PackedList<Item> items;
  for (const auto* entry : referenced) items.push_back(*entry->item);
  return items;
}

PackedList<HVSearchResult> SessionProcessingHelper::missingResults() const {
  return _inOrder(idResultMap_);
}

PackedList<HVSuggestion> SessionProcessingHelper::missingSuggestions() const {
  return _inOrder(idSuggestionMap_);
}

}  // namespace zelkord
