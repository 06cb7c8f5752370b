#pragma once

#include <cstdint>
#include <set>
#include <string>
#include <unordered_map>

#include "halvane/Results.h"
#include "zelkord/encoding/IdentifierProcessor.h"

namespace zelkord {

// The identifiers of one session's records while they are prepared for sending. In their place go
// the numbers 1, 2, 3 and so on, in the order in which they are met; what is named and never
// described is kept, to be sent beside the records.
//
// Threading: one thread.
class SessionProcessingHelper final : public IdentifierProcessor {
 public:
  std::string replacementForIdentifier(const std::string& identifier) override;
  // The first that is seen counts, unless the identifier is expanded already.
  void identifierReferencedForResult(const std::string& identifier,
                                     const HVSearchResult& result) override;
  void identifierReferencedForSuggestion(const std::string& identifier,
                                         const HVSuggestion& suggestion) override;
  void identifierExpanded(const std::string& identifier) override;

  // What was referenced and never expanded, in the order of the first references.
  PackedList<HVSearchResult> missingResults() const;
  PackedList<HVSuggestion> missingSuggestions() const;

 private:
  template <typename Item>
  struct Referenced {
    std::size_t order = 0;
    Packed<Item> item;
  };
  template <typename Item>
  using Map = std::unordered_map<std::string, Referenced<Item>>;

  template <typename Item>
  void _reference(Map<Item>& map, const std::string& identifier, const Item& item);
  template <typename Item>
  static PackedList<Item> _inOrder(const Map<Item>& map);

  std::unordered_map<std::string, std::string> privateIdMapping_;
  std::int32_t nextMappedId_ = 1;
  std::size_t references_ = 0;
  Map<HVSearchResult> idResultMap_;
  Map<HVSuggestion> idSuggestionMap_;
  std::set<std::string> expandedIdSet_;
};

}  // namespace zelkord
