// The daemon's program: picks the real host, builds the daemon on it, runs for ever.

#include <fmt/core.h>

#include <chrono>
#include <cstdio>
#include <memory>

#include "corezelkor/Constants.h"
#include "platform/linux/LinuxPlatform.h"
#include "platform/linux/process/ProcessStart.h"
#include "platform/linux/process/StartMemory.h"
#include "zelkord/core/CommandLine.h"
#include "zelkord/core/Daemon.h"

namespace {

constexpr int kCannotServe = 1;
constexpr int kWrongUsage = 2;
// By then what begins with the start has begun.
constexpr zelkor::Duration kStartTime = std::chrono::seconds(1);

zelkord::LinuxPlatformOptions optionsOf(const zelkord::CommandLine& line) {
  zelkord::LinuxPlatformOptions options;
  options.logFile = line.logFile.value_or("");
  options.logLevel = line.logLevel;
  options.exitWhenIdle = line.exitWhenIdle;
  options.clockRate = line.clockRate;
  options.usesSessionBus = line.sessionBus;
  return options;
}

int fail(const zelkor::Error& error) {
  fmt::print(stderr, "zelkord: {}\n", error.reason().value_or(error.description()));
  return kCannotServe;
}

int serve(const zelkord::CommandLine& line) {
  zelkor::Error error;
  const auto host = zelkord::LinuxPlatform::make(optionsOf(line), &error);
  if (!host) return fail(error);
  zelkord::Daemon daemon(host->platform());
  const auto refused = daemon.start();
  // Nothing is torn down: work under way refers to the graph, and the process's end is its end.
  if (refused) host->platform().process.exit(fail(*refused));
  zelkord::admitSignalsOfLeaving();
  const auto started = host->platform().queues.main().after(
      kStartTime, [] { zelkord::releaseStartMemory(); }, zelkord::TimeBase::Real);
  host->platform().process.runMainLoop();
  return 0;
}

}  // namespace

int main(int count, char** arguments) {
  zelkord::prepareProcess();
  zelkord::keepHeapSmall();
  const auto parsed = zelkord::parseCommandLine({arguments + 1, arguments + count});
  if (const auto* problem = std::get_if<std::string>(&parsed)) {
    fmt::print(stderr, "zelkord: {}\n{}", *problem, zelkord::usageText());
    return kWrongUsage;
  }
  const auto& line = std::get<zelkord::CommandLine>(parsed);
  switch (line.action) {
    case zelkord::CommandLine::Action::ShowVersion:
      fmt::print("{}\n", zelkor::kZLKZelkordNameVersion);
      return 0;
    case zelkord::CommandLine::Action::ShowHelp:
      fmt::print("{}", zelkord::usageText());
      return 0;
    case zelkord::CommandLine::Action::Run:
      return serve(line);
  }
}
