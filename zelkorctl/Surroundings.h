#pragma once

#include <cstddef>
#include <ostream>

namespace zelkorctl {

// Where the tool reads and writes.
struct Surroundings {
  std::ostream& out;
  std::ostream& err;
  int input = 0;    // file descriptor
  int output = -1;  // likewise, of `out`; asked only while it is a terminal
  bool inputIsTerminal = false;
  bool outputIsTerminal = false;
  bool showsImages = false;   // the output is a terminal that can
  std::size_t columns = 100;  // of the output
};

enum ExitStatus { kAnswered = 0, kErrorReply = 1, kWrongUsage = 2, kNotReachable = 3 };

}  // namespace zelkorctl
