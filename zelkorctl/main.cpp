#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <iostream>

#include "zelkorctl/InlineImage.h"
#include "zelkorctl/TerminalSize.h"
#include "zelkorctl/Tool.h"

namespace {

// A standard descriptor that is closed would be the next one to be opened: a socket that is read as
// if somebody typed there. In its place comes one that can be neither read nor written.
void holdStandardDescriptors() {
  for (const int standard : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
    if (::fcntl(standard, F_GETFD) >= 0) continue;
    const int access = standard == STDIN_FILENO ? O_WRONLY : O_RDONLY;
    [[maybe_unused]] const int held = ::open("/dev/null", access);  // the lowest that is free
  }
}

std::size_t columnsOfOutput() {
  constexpr std::size_t kOfFiles = 1000;  // a file or pipe gets whole texts
  constexpr std::size_t kFewest = 20;
  if (::isatty(STDOUT_FILENO) == 0) return kOfFiles;
  return std::max(kFewest, zelkorctl::terminalSize(STDOUT_FILENO).columns);
}

bool outputShowsImages() {
  const char* type = std::getenv("TERM");
  const char* program = std::getenv("TERM_PROGRAM");
  return ::isatty(STDOUT_FILENO) != 0 &&
         zelkorctl::showsInlineImages(type ? type : "", program ? program : "");
}

}  // namespace

int main(int count, char** words) {
  holdStandardDescriptors();
  std::ios::sync_with_stdio(false);
  return zelkorctl::runTool({words + (count > 0 ? 1 : 0), words + count},
                            {.out = std::cout,
                             .err = std::cerr,
                             .input = STDIN_FILENO,
                             .output = STDOUT_FILENO,
                             .inputIsTerminal = ::isatty(STDIN_FILENO) != 0,
                             .outputIsTerminal = ::isatty(STDOUT_FILENO) != 0,
                             .showsImages = outputShowsImages(),
                             .columns = columnsOfOutput()});
}
