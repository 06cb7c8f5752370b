#pragma once

#include <cstddef>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "benchmarks/process/ChildProcess.h"
#include "benchmarks/process/SandboxProcess.h"
#include "benchmarks/process/ScratchFolder.h"

namespace zelkord::bench {

// A small machine for one measurement: directories of its own, a session bus, and on demand the
// daemon, which talks to the sandbox, and the floor.
//
// Ownership: the sandbox outlives it. Its end stops all processes and removes the directories.
// Errors: throws std::runtime_error when something does not come up; the end of the daemon's log is
// then on standard error.
class ProcessBed {
 public:
  inline static const std::string kDaemonName = "com.quenta.zelkord";
  inline static const std::string kFloorName = "com.quenta.zelkord.benchmark.Floor";

  explicit ProcessBed(const SandboxProcess& sandbox);
  ProcessBed(const ProcessBed&) = delete;
  ProcessBed& operator=(const ProcessBed&) = delete;

  // Both start if need be and return when the socket and the name on the bus are there.
  ChildProcess& daemon();
  // A bed has one floor, the one that is asked for first: an echo, whose answers have a body of
  // that size, or a broker, which asks the sandbox at that URL with these header lines.
  ChildProcess& floor(std::size_t bodySize = 0);
  ChildProcess& broker(const std::string& url, const std::vector<std::string>& headers);
  // Microseconds from the start of a new process to the name, which then is stopped.
  double timeDaemonStart();
  double timeFloorStart();

  std::string busAddress() const { return "unix:path=" + (folder_.path() / "bus").string(); }
  std::string daemonAddress() const { return "unix:path=" + _daemonSocket().string(); }
  std::string floorAddress() const { return "unix:path=" + _floorSocket().string(); }

 private:
  std::filesystem::path _daemonSocket() const;
  std::filesystem::path _floorSocket() const { return folder_.path() / "floor"; }
  void _writeSettings(const SandboxProcess& sandbox) const;
  void _startBus();
  std::unique_ptr<ChildProcess> _startDaemon() const;
  std::unique_ptr<ChildProcess> _startFloor(std::size_t bodySize) const;
  ChildProcess& _floorThatServes();
  void _showLog() const;

  const ScratchFolder folder_;
  ChildProcess::Environment environment_;
  // In the order of their start.
  std::unique_ptr<ChildProcess> bus_;
  std::unique_ptr<ChildProcess> daemon_;
  std::unique_ptr<ChildProcess> floor_;
};

}  // namespace zelkord::bench
