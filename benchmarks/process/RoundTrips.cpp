#include "benchmarks/process/BusClient.h"
#include "benchmarks/process/Comparison.h"
#include "benchmarks/process/Measurements.h"
#include "benchmarks/process/ProcessBed.h"

namespace zelkord::bench {
namespace {

constexpr Comparison::Limits kPrivateDoor{.median = 1.5, .tail = 2, .processor = 2, .wakeUps = 1};
constexpr Comparison::Limits kBusDoor{.median = 1.3, .tail = 2};

// One client of each service; both ask the same.
void compare(const Plan& plan, ProcessBed& bed, BusClient ours, BusClient floor, Report& report,
             const std::string& name, const Comparison::Limits& limits) {
  const Search tooShort{.queryString = "a"};
  ours.firstSearch(tooShort);
  const auto contender = [&tooShort](const char* whose, BusClient& client, pid_t process) {
    return Contender::process(whose, process, [&client, &tooShort] { client.search(tooShort); });
  };
  Comparison::run({plan.rounds, plan.roundTrips}, contender("ours", ours, bed.daemon().pid()),
                  contender("echo", floor, bed.floor().pid()))
      .report(report, name, limits);
}

}  // namespace

void measureRoundTrips(const Plan& plan, const SandboxProcess& sandbox, Report& report) {
  sandbox.control("bag", R"({"minimum_query_length": 3})");
  ProcessBed bed(sandbox);
  bed.daemon();
  bed.floor();
  compare(plan, bed, BusClient::ofPeer(bed.daemonAddress()), BusClient::ofPeer(bed.floorAddress()),
          report, "round trip, private door", kPrivateDoor);
  compare(plan, bed, BusClient::onBus(bed.busAddress(), ProcessBed::kDaemonName),
          BusClient::onBus(bed.busAddress(), ProcessBed::kFloorName), report,
          "round trip, bus door", kBusDoor);
  sandbox.control("reset");
}

}  // namespace zelkord::bench
