#pragma once

#include <cstddef>

namespace zelkorctl {

struct TerminalSize {
  std::size_t columns = 80;
  std::size_t rows = 24;
};

// As it is now; the usual one of something that does not say.
TerminalSize terminalSize(int descriptor);

}  // namespace zelkorctl
