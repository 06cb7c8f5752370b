#pragma once

#include <string>

#include "platform/api/TextInputService.h"

namespace zelkord {

class FakeTextInput final : public TextInputService {
 public:
  std::string inputMode = "en-US";
  double scale = 2.0;

  std::string currentInputMode() const override { return inputMode; }
  double mainScreenScale() const override { return scale; }
};

}  // namespace zelkord
