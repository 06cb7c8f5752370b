#pragma once

#include <string>

#include "base/Namespace.h"

namespace zelkord {

// Answers from memory, on any thread; a change is announced in the notification centre.
class TextInputService {
 public:
  virtual ~TextInputService() = default;
  // The current input mode, else the first default one of the locale; may be empty.
  virtual std::string currentInputMode() const = 0;
  virtual double mainScreenScale() const = 0;
};

}  // namespace zelkord
