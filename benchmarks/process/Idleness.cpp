#include <iostream>
#include <thread>

#include "benchmarks/process/BusClient.h"
#include "benchmarks/process/Measurements.h"
#include "benchmarks/process/ProcessBed.h"
#include "benchmarks/process/ProcessFacts.h"

namespace zelkord::bench {
namespace {

constexpr double kResidentLimit = 25;  // MiB
constexpr double kWakeUpLimit = 1;     // a minute

struct IdleFigures {
  double residentAtStart = 0;
  double residentAfterSearch = 0;
  double wakeUps = 0;  // a minute

  void report(Report& report) const {
    report.bound("resident memory after start", residentAtStart, kResidentLimit, "MiB");
    report.bound("resident memory after a search", residentAfterSearch, kResidentLimit, "MiB");
    report.bound("wake-ups of an idle daemon", wakeUps, kWakeUpLimit, "a minute");
  }
};

double wakeUpsDuring(std::chrono::seconds time, pid_t process) {
  const auto before = sleepsOf(process);
  std::this_thread::sleep_for(time);
  const auto sleeps = sleepsBetween(before, sleepsOf(process));
  for (const auto& [thread, count] : sleeps) {
    std::cerr << "woke up " << count << " times: thread " << thread << "\n";
  }
  return static_cast<double>(sumOf(sleeps)) * 60 / static_cast<double>(time.count());
}

IdleFigures measure(const Plan& plan, ProcessBed& bed) {
  IdleFigures figures;
  const auto process = bed.daemon().pid();
  std::this_thread::sleep_for(std::chrono::seconds(2));
  figures.residentAtStart = residentMiBOf(process);
  auto client = BusClient::ofPeer(bed.daemonAddress());
  client.firstSearch({.queryString = "snow"});
  figures.residentAfterSearch = residentMiBOf(process);
  std::this_thread::sleep_for(plan.settling);
  figures.wakeUps = wakeUpsDuring(plan.idle, process);
  return figures;
}

}  // namespace

std::future<std::function<void(Report&)>> measureIdleness(const Plan& plan,
                                                          const SandboxProcess& sandbox) {
  auto bed = std::make_shared<ProcessBed>(sandbox);
  return std::async(std::launch::async, [plan, bed]() -> std::function<void(Report&)> {
    return [figures = measure(plan, *bed)](Report& report) { figures.report(report); };
  });
}

}  // namespace zelkord::bench
