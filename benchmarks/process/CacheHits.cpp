#include <stdexcept>

#include "benchmarks/process/BusClient.h"
#include "benchmarks/process/Comparison.h"
#include "benchmarks/process/Measurements.h"
#include "benchmarks/process/ProcessBed.h"

namespace zelkord::bench {
namespace {

constexpr Comparison::Limits kLimits{.median = 1.5, .processor = 2, .wakeUps = 1};
constexpr std::size_t kBody = 20'480;
constexpr const char* kText = "snow";

void expectBody(const SearchAnswer& answer, const std::string& whose) {
  if (answer.dataSize != kBody)
    throw std::runtime_error(whose + ": a body of " + std::to_string(answer.dataSize) + " bytes");
}

}  // namespace

void measureCacheHits(const Plan& plan, const SandboxProcess& sandbox, Report& report) {
  ProcessBed bed(sandbox);
  bed.daemon();
  bed.floor(kBody);
  auto ours = BusClient::ofPeer(bed.daemonAddress());
  auto floor = BusClient::ofPeer(bed.floorAddress());
  // A search with an item goes to the service; only from the cache can one without have its size.
  ours.firstSearch(
      {.queryString = kText, .queryItems = {{"pad", std::to_string(kBody)}}, .verbose = true});
  const Search search{.queryString = kText};
  const auto contender = [&search](const char* whose, BusClient& client, pid_t process) {
    return Contender::process(
        whose, process, [&client, &search, whose] { expectBody(client.search(search), whose); });
  };
  Comparison::run({plan.rounds, plan.roundTrips}, contender("ours", ours, bed.daemon().pid()),
                  contender("echo", floor, bed.floor().pid()))
      .report(report, "cache hit, 20 KiB, private door", kLimits);
}

}  // namespace zelkord::bench
