#include "zelkorctl/TerminalSize.h"

#include <sys/ioctl.h>

namespace zelkorctl {

TerminalSize terminalSize(int descriptor) {
  TerminalSize result;
  winsize size{};
  if (::ioctl(descriptor, TIOCGWINSZ, &size) != 0) return result;
  if (size.ws_col > 0) result.columns = size.ws_col;
  if (size.ws_row > 0) result.rows = size.ws_row;
  return result;
}

}  // namespace zelkorctl
