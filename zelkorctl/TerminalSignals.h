#pragma once

#include <signal.h>

#include <optional>

namespace zelkorctl {

// The signals that end a program at a terminal, and the one of a resize, as something to wait for
// instead of something that happens, so that the terminal can be put back first.
//
// Threading: made, used and destroyed on one thread, before any other is made: those that come
// later must not take the signals.
class TerminalSignals {
 public:
  TerminalSignals();
  ~TerminalSignals();  // they happen again
  TerminalSignals(const TerminalSignals&) = delete;
  TerminalSignals& operator=(const TerminalSignals&) = delete;

  // Readable while one has come.
  int descriptor() const { return descriptor_; }
  std::optional<int> take() const;

 private:
  sigset_t before_{};
  int descriptor_ = -1;
};

}  // namespace zelkorctl
