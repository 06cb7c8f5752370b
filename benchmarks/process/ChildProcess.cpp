#include "benchmarks/process/ChildProcess.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>

#include <chrono>
#include <csignal>
#include <stdexcept>
#include <thread>

namespace zelkord::bench {
namespace {

std::vector<char*> pointersTo(std::vector<std::string>& texts) {
  std::vector<char*> pointers;
  for (auto& text : texts) pointers.push_back(text.data());
  pointers.push_back(nullptr);
  return pointers;
}

std::vector<std::string> assignments(const ChildProcess::Environment& environment) {
  std::vector<std::string> texts;
  for (const auto& [name, value] : environment) texts.push_back(name + "=" + value);
  return texts;
}

}  // namespace

ChildProcess::ChildProcess(const std::vector<std::string>& command, const Environment& environment,
                           const std::filesystem::path& output) {
  auto arguments = command;
  auto variables = assignments(environment);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, 1, output.c_str(), O_WRONLY | O_CREAT | O_APPEND,
                                   0600);
  posix_spawn_file_actions_adddup2(&actions, 1, 2);
  const int problem = ::posix_spawn(&pid_, command.front().c_str(), &actions, nullptr,
                                    pointersTo(arguments).data(), pointersTo(variables).data());
  posix_spawn_file_actions_destroy(&actions);
  if (problem != 0) throw std::runtime_error("cannot start " + command.front());
}

ChildProcess::~ChildProcess() {
  if (!isRunning()) return;
  ::kill(pid_, SIGTERM);
  if (_endsWithinSeconds(3)) return;
  ::kill(pid_, SIGKILL);
  ::waitpid(pid_, nullptr, 0);
}

bool ChildProcess::isRunning() {
  if (!ended_) ended_ = ::waitpid(pid_, nullptr, WNOHANG) != 0;
  return !ended_;
}

bool ChildProcess::_endsWithinSeconds(int seconds) {
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(seconds);
  while (isRunning() && std::chrono::steady_clock::now() < deadline) {
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  return ended_;
}

}  // namespace zelkord::bench
