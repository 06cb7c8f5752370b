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
  auto before = voluntarySwitchesOf(process);
  std::this_thread::sleep_for(time);
  std::int64_t sum = 0;
  for (const auto& [thread, count] : voluntarySwitchesOf(process)) {
    const auto more = count - before[thread];
    if (more > 0) std::cerr << "woke up " << more << " times: thread " << thread << "\n";
    sum += more;
  }
  return static_cast<double>(sum) * 60 / static_cast<double>(time.count());
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
