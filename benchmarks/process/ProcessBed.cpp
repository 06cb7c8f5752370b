#include "benchmarks/process/ProcessBed.h"

#include <cstdlib>
#include <fstream>
#include <iostream>

#include "benchmarks/process/BusConnecting.h"
#include "benchmarks/process/NameWatch.h"
#include "benchmarks/process/Waiting.h"

namespace zelkord::bench {
namespace {

constexpr std::chrono::seconds kPatience{10};

std::string busConfiguration(const std::string& address) {
  return "<!DOCTYPE busconfig PUBLIC \"-//freedesktop//DTD D-Bus Bus Configuration 1.0//EN\"\n"
         " \"http://www.freedesktop.org/standards/dbus/1.0/busconfig.dtd\">\n"
         "<busconfig><type>session</type><listen>" +
         address +
         "</listen><auth>EXTERNAL</auth><policy context=\"default\"><allow send_destination=\"*\" "
         "eavesdrop=\"true\"/><allow eavesdrop=\"true\"/><allow own=\"*\"/></policy></busconfig>\n";
}

ChildProcess::Environment environmentIn(const std::filesystem::path& folder) {
  ChildProcess::Environment environment = {{"HOME", folder / "home"},
                                           {"LANG", "en_US.UTF-8"},
                                           {"PATH", "/usr/bin:/bin"},
                                           {"DBUS_SYSTEM_BUS_ADDRESS", "unix:path=/nonexistent"},
                                           {"XDG_CONFIG_DIRS", folder / "etc"}};
  for (const auto* kind : {"CACHE_HOME", "CONFIG_HOME", "DATA_HOME", "STATE_HOME", "RUNTIME_DIR"}) {
    const auto place = folder / kind;
    std::filesystem::create_directories(place);
    std::filesystem::permissions(place, std::filesystem::perms::owner_all);
    environment[std::string("XDG_") + kind] = place;
  }
  return environment;
}

// A socket's file is there a little before it listens.
bool accepts(const std::string& address) {
  try {
    return connectToPeer(address) != nullptr;
  } catch (const std::runtime_error&) {
    return false;
  }
}

}  // namespace

ProcessBed::ProcessBed(const SandboxProcess& sandbox)
    : environment_(environmentIn(folder_.path())) {
  environment_["DBUS_SESSION_BUS_ADDRESS"] = busAddress();
  environment_["SSL_CERT_FILE"] = sandbox.certificate();
  _writeSettings(sandbox);
  _startBus();
}

void ProcessBed::_writeSettings(const SandboxProcess& sandbox) const {
  const auto folder = folder_.path() / "etc" / "com.quenta.zelkord";
  std::filesystem::create_directories(folder);
  std::ofstream(folder / "defaults.json") << R"({"ZLKBagURL": ")" << sandbox.bagUrl() << "\"}\n";
}

void ProcessBed::_startBus() {
  const auto configuration = folder_.path() / "bus.conf";
  std::ofstream(configuration) << busConfiguration(busAddress());
  bus_ = std::make_unique<ChildProcess>(
      std::vector<std::string>{"/usr/bin/dbus-daemon", "--nofork",
                               "--config-file=" + configuration.string()},
      environment_, folder_.path() / "bus.output");
  waitFor("the bus", kPatience, [this] { return accepts(busAddress()); });
}

std::filesystem::path ProcessBed::_daemonSocket() const {
  return std::filesystem::path(environment_.at("XDG_RUNTIME_DIR")) / "com.quenta.zelkord" /
         "socket";
}

std::unique_ptr<ChildProcess> ProcessBed::_startDaemon() const {
  return std::make_unique<ChildProcess>(
      std::vector<std::string>{ZK_ZELKORD_BINARY, "--log-file", folder_.path() / "log"},
      environment_, folder_.path() / "output");
}

std::unique_ptr<ChildProcess> ProcessBed::_startFloor(std::size_t bodySize) const {
  std::filesystem::remove(_floorSocket());
  return std::make_unique<ChildProcess>(
      std::vector<std::string>{ZK_FLOOR_BINARY, _floorSocket(), kFloorName,
                               std::to_string(bodySize)},
      environment_, folder_.path() / "floor.output");
}

ChildProcess& ProcessBed::daemon() {
  if (daemon_) return *daemon_;
  NameWatch watch(busAddress(), kDaemonName);
  daemon_ = _startDaemon();
  if (!watch.waitForOwner()) {
    _showLog();
    throw std::runtime_error("the daemon does not start");
  }
  waitFor("the socket", kPatience, [this] { return accepts(daemonAddress()); });
  return *daemon_;
}

ChildProcess& ProcessBed::floor(std::size_t bodySize) {
  if (floor_) return *floor_;
  floor_ = _startFloor(bodySize);
  return _floorThatServes();
}

ChildProcess& ProcessBed::broker(const std::string& url, const std::vector<std::string>& headers) {
  if (floor_) return *floor_;
  std::vector<std::string> command = {ZK_FLOOR_BROKER_BINARY, _floorSocket(), url};
  command.insert(command.end(), headers.begin(), headers.end());
  floor_ = std::make_unique<ChildProcess>(command, environment_, folder_.path() / "floor.output");
  return _floorThatServes();
}

ChildProcess& ProcessBed::_floorThatServes() {
  waitFor("the floor", kPatience, [this] { return accepts(floorAddress()); });
  return *floor_;
}

double ProcessBed::timeDaemonStart() {
  NameWatch watch(busAddress(), kDaemonName);
  const auto start = Clock::now();
  const auto process = _startDaemon();
  if (!watch.waitForOwner()) _showLog();
  return microsecondsSince(start);
}

double ProcessBed::timeFloorStart() {
  NameWatch watch(busAddress(), kFloorName);
  const auto start = Clock::now();
  const auto process = _startFloor(0);
  watch.waitForOwner();
  return microsecondsSince(start);
}

void ProcessBed::_showLog() const {
  for (const auto* name : {"output", "log"}) {
    std::ifstream file(folder_.path() / name);
    std::cerr << "-- " << name << " --\n" << file.rdbuf() << "\n";
    std::cerr.clear();
  }
}

}  // namespace zelkord::bench
