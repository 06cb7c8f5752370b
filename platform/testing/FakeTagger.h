#pragma once

#include <map>
#include <string>

#include "platform/api/LinguisticTagger.h"

namespace zelkord {

// Languages by text, as a test sets them; every other text has `fallback`.
class FakeTagger final : public LinguisticTagger {
 public:
  std::map<std::string, std::string> languages;
  std::string fallback = "und";

  std::string languageAtStart(const std::string& text) const override {
    const auto found = languages.find(text);
    return found == languages.end() ? fallback : found->second;
  }
};

}  // namespace zelkord
