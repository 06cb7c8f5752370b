#pragma once

#include <ostream>
#include <string>
#include <vector>

#include "zelkorctl/TerminalSize.h"

namespace zelkorctl {

// The alternate screen of a terminal, for as long as this lives; what stood there before is back
// afterwards.
//
// Threading: one thread. Ownership: borrows the stream and the descriptor.
class TerminalScreen {
 public:
  TerminalScreen(std::ostream& out, int descriptor);
  ~TerminalScreen();
  TerminalScreen(const TerminalScreen&) = delete;
  TerminalScreen& operator=(const TerminalScreen&) = delete;

  TerminalSize size() const { return terminalSize(descriptor_); }
  // Printable lines from the top; what does not fit is left out. The cursor stands behind the
  // first.
  void show(const std::vector<std::string>& lines);

 private:
  std::ostream& out_;
  const int descriptor_;
};

}  // namespace zelkorctl
