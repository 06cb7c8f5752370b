#include "benchmarks/process/BusClient.h"
#include "benchmarks/process/Comparison.h"
#include "benchmarks/process/Measurements.h"
#include "benchmarks/process/ProcessBed.h"
#include "benchmarks/process/ProcessFacts.h"

namespace zelkord::bench {
namespace {

constexpr Comparison::Limits kLimits{.median = 1.5, .tail = 2, .processor = 0};

// One client of each service; both ask the same.
void compare(const Plan& plan, ProcessBed& bed, BusClient ours, BusClient floor, Report& report,
             const std::string& name) {
  const Search tooShort{.queryString = "a"};
  ours.firstSearch(tooShort);
  const auto contender = [&tooShort](BusClient& client, pid_t process) {
    return Contender{[&client, &tooShort] { client.search(tooShort); },
                     [process] { return processorTimeOf(process); }};
  };
  const Comparison::Size size{plan.rounds, plan.roundTrips};
  Comparison::run(size, contender(ours, bed.daemon().pid()), contender(floor, bed.floor().pid()))
      .report(report, name, kLimits);
}

}  // namespace

void measureRoundTrips(const Plan& plan, const SandboxProcess& sandbox, Report& report) {
  sandbox.control("bag", R"({"minimum_query_length": 3})");
  ProcessBed bed(sandbox);
  bed.daemon();
  bed.floor();
  compare(plan, bed, BusClient::ofPeer(bed.daemonAddress()), BusClient::ofPeer(bed.floorAddress()),
          report, "round trip, private door");
  compare(plan, bed, BusClient::onBus(bed.busAddress(), ProcessBed::kDaemonName),
          BusClient::onBus(bed.busAddress(), ProcessBed::kFloorName), report,
          "round trip, bus door");
  sandbox.control("reset");
}

}  // namespace zelkord::bench
