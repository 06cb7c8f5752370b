#pragma once

#include <string>

#include "halvane/Results.h"

namespace zelkord {

// What a session knows of the identifiers in its records while it prepares them to be sent: the
// text that goes in the place of each, and which results and suggestions are only referred to.
// Threading: one thread.
class IdentifierProcessor {
 public:
  virtual ~IdentifierProcessor() = default;
  // The same text for the same identifier.
  virtual std::string replacementForIdentifier(const std::string& identifier) = 0;
  // A record names the item without describing it.
  virtual void identifierReferencedForResult(const std::string& identifier,
                                             const HVSearchResult& result) = 0;
  virtual void identifierReferencedForSuggestion(const std::string& identifier,
                                                 const HVSuggestion& suggestion) = 0;
  // A record describes the item of that identifier.
  virtual void identifierExpanded(const std::string& identifier) = 0;
};

}  // namespace zelkord
