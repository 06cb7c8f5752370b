#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdlib>
#include <iostream>

#include "zelkorctl/InlineImage.h"
#include "zelkorctl/Tool.h"

namespace {

std::size_t columnsOfOutput() {
  constexpr std::size_t kOfFiles = 1000;  // a file or pipe gets whole texts
  winsize size{};
  if (::isatty(STDOUT_FILENO) == 0) return kOfFiles;
  return ::ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col >= 20 ? size.ws_col : 80;
}

bool outputShowsImages() {
  const char* type = std::getenv("TERM");
  const char* program = std::getenv("TERM_PROGRAM");
  return ::isatty(STDOUT_FILENO) != 0 &&
         zelkorctl::showsInlineImages(type ? type : "", program ? program : "");
}

}  // namespace

int main(int count, char** words) {
  std::ios::sync_with_stdio(false);
  return zelkorctl::runTool({words + (count > 0 ? 1 : 0), words + count},
                            {.out = std::cout,
                             .err = std::cerr,
                             .input = STDIN_FILENO,
                             .inputIsTerminal = ::isatty(STDIN_FILENO) != 0,
                             .outputIsTerminal = ::isatty(STDOUT_FILENO) != 0,
                             .showsImages = outputShowsImages(),
                             .columns = columnsOfOutput()});
}
