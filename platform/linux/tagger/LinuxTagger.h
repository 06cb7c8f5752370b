#pragma once

#include "platform/api/LinguisticTagger.h"

namespace zelkord {

// Languages by CLD2, of the first words of a text, as many as it takes. A text too short or too
// mixed to tell is "und". Threading: any thread.
class LinuxTagger final : public LinguisticTagger {
 public:
  std::string languageAtStart(const std::string& text) const override;
};

}  // namespace zelkord
