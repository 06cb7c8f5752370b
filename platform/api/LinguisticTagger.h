#pragma once

#include <string>

#include "base/Namespace.h"

namespace zelkord {

// Answers from memory, on any thread; a change is announced in the notification centre.
class LinguisticTagger {
 public:
  virtual ~LinguisticTagger() = default;
  // BCP 47 tag of the language at the start of the text; "und" when unknown.
  virtual std::string languageAtStart(const std::string& text) const = 0;
};

}  // namespace zelkord
