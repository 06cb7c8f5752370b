#pragma once

#include <cstdint>
#include <filesystem>
#include <span>
#include <string>

#include "sandbox/core/Outcome.h"

namespace sandbox {

// The command line.
struct Options {
  std::filesystem::path state;
  std::uint16_t port = 0;
  std::filesystem::path portFile;  // empty: none
  std::filesystem::path dataRoot = "/usr/share";
  unsigned threads = 0;  // 0: as many as there are processors
  bool quiet = false;
  bool background = false;
  bool help = false;
  bool version = false;
};

// `arguments` without the program's name. The failure is a line for people.
Outcome<Options> parseOptions(std::span<const char* const> arguments);

// What --help prints.
std::string usage();
// What --version prints.
std::string version();

}  // namespace sandbox
