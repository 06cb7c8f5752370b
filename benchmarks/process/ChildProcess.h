#pragma once

#include <sys/types.h>

#include <filesystem>
#include <map>
#include <string>
#include <vector>

namespace zelkord::bench {

// A program that runs beside us, its output in a file.
//
// Ownership: its end stops the program, with SIGTERM and, after three seconds, SIGKILL.
// Errors: throws std::runtime_error when it cannot be started.
class ChildProcess {
 public:
  using Environment = std::map<std::string, std::string>;

  // `environment` is all it gets.
  ChildProcess(const std::vector<std::string>& command, const Environment& environment,
               const std::filesystem::path& output);
  ~ChildProcess();
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;

  pid_t pid() const { return pid_; }
  bool isRunning();

 private:
  bool _endsWithinSeconds(int seconds);

  pid_t pid_ = -1;
  bool ended_ = false;
};

}  // namespace zelkord::bench
