#pragma once

#include <termios.h>

namespace zelkorctl {

// A terminal that gives every key at once, without echo, for as long as this lives.
//
// Errors: on something that is no terminal it does nothing.
class RawTerminal {
 public:
  explicit RawTerminal(int descriptor);
  ~RawTerminal();
  RawTerminal(const RawTerminal&) = delete;
  RawTerminal& operator=(const RawTerminal&) = delete;

 private:
  const int descriptor_;
  termios before_{};
  const bool isTerminal_;
};

}  // namespace zelkorctl
