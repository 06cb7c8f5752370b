#include "zelkorctl/TerminalScreen.h"

#include <fmt/format.h>

#include <algorithm>

#include "zelkorctl/Printable.h"

namespace zelkorctl {

TerminalScreen::TerminalScreen(std::ostream& out, int descriptor)
    : out_(out), descriptor_(descriptor) {
  out_ << "\033[?1049h" << std::flush;
}

TerminalScreen::~TerminalScreen() { out_ << "\033[?1049l" << std::flush; }

void TerminalScreen::show(const std::vector<std::string>& lines) {
  const auto [columns, rows] = size();
  // The last column stays free: a character there would leave the cursor between two lines.
  const auto width = columns - 1;
  const auto count = std::min(lines.size(), rows);
  out_ << "\033[H";
  for (std::size_t i = 0; i < count; ++i) {
    out_ << (i > 0 ? "\r\n" : "") << fitted(lines[i], width) << "\033[K";
  }
  out_ << "\033[J";
  const auto cursor = lines.empty() ? 0 : displayWidth(fitted(lines.front(), width));
  out_ << fmt::format("\033[1;{}H", cursor + 1) << std::flush;
}

}  // namespace zelkorctl
