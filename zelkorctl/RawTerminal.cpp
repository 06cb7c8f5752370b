#include "zelkorctl/RawTerminal.h"

namespace zelkorctl {

RawTerminal::RawTerminal(int descriptor)
    : descriptor_(descriptor), isTerminal_(::tcgetattr(descriptor, &before_) == 0) {
  if (!isTerminal_) return;
  auto raw = before_;
  // Ctrl-C comes as a byte, so that the settings are always put back.
  raw.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO | ISIG | IEXTEN);
  raw.c_iflag &= ~static_cast<tcflag_t>(IXON | ICRNL);
  raw.c_cc[VMIN] = 1;
  raw.c_cc[VTIME] = 0;
  ::tcsetattr(descriptor_, TCSADRAIN, &raw);
}

RawTerminal::~RawTerminal() {
  if (isTerminal_) ::tcsetattr(descriptor_, TCSADRAIN, &before_);
}

}  // namespace zelkorctl
