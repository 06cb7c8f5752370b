// Measures whole processes: the daemon, the sandbox service and bare programs beside it, each on
// directories and a bus of its own. Prints lines for benchmarks/table.py.

#include <curl/curl.h>

#include <cstdio>
#include <cstdlib>
#include <exception>

#include "benchmarks/process/Measurements.h"

namespace {

using namespace zelkord::bench;

void measureAll(const Plan& plan) {
  Report report;
  const SandboxProcess sandbox;
  std::future<std::function<void(Report&)>> idleness;
  if (plan.includes("idle")) idleness = measureIdleness(plan, sandbox);
  if (plan.includes("start")) measureStart(plan, sandbox, report);
  if (plan.includes("roundtrip")) measureRoundTrips(plan, sandbox, report);
  if (plan.includes("hit")) measureCacheHits(plan, sandbox, report);
  if (plan.includes("states")) measureFullCaches(plan, sandbox, report);
  if (plan.includes("images")) measureImages(plan, sandbox, report);
  if (plan.includes("network")) measureNetworkSearches(plan, sandbox, report);
  if (plan.includes("burst")) measureBurst(plan, sandbox, report);
  if (plan.includes("typing")) measureTyping(plan, sandbox, report);
  if (idleness.valid()) idleness.get()(report);
}

}  // namespace

int main(int count, char** arguments) {
  curl_global_init(CURL_GLOBAL_DEFAULT);
  try {
    measureAll(parsePlan({arguments + 1, arguments + count}));
  } catch (const std::exception& problem) {
    std::fprintf(stderr, "%s\n", problem.what());
    return EXIT_FAILURE;
  }
  return EXIT_SUCCESS;
}
