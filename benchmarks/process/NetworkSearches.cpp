#include <stdexcept>

#include "benchmarks/process/BusClient.h"
#include "benchmarks/process/Comparison.h"
#include "benchmarks/process/CurlClient.h"
#include "benchmarks/process/Measurements.h"
#include "benchmarks/process/ProcessBed.h"
#include "benchmarks/process/ProcessFacts.h"

namespace zelkord::bench {
namespace {

constexpr Comparison::Limits kLimits{.median = 1.15, .tail = 0, .processor = 1.5};

// How far away services are in practice; the loopback alone shows our own microseconds enlarged.
constexpr const char* kDistance = R"({"path": "/search", "count": 0, "delay_ms": 20})";

// Names countries: the answer has images, whose hosts the daemon learns, and result sets, which it
// keeps.
constexpr const char* kWithImages = "fr";
// Means nothing, so the answer has next to nothing but its size.
constexpr const char* kWithout = "xqzvw";

// The item keeps the answer out of the daemon's cache and gives it its size.
Search searchOfSize(const std::string& text, std::size_t size) {
  return {.queryString = text, .queryItems = {{"pad", std::to_string(size)}}};
}

void compare(const Comparison::Size& repetitions, ProcessBed& bed, BusClient& client,
             CurlClient& bare, Search search, std::size_t size, Report& report,
             const std::string& name) {
  search.verbose = true;
  const auto first = client.firstSearch(search);
  search.verbose = false;
  bare.prepare(first.url, first.headers);
  const auto bareSize = bare.fetch();
  if (first.dataSize != size || bareSize != size) {
    throw std::runtime_error("bodies of " + std::to_string(first.dataSize) + " and " +
                             std::to_string(bareSize) + " bytes");
  }
  const auto process = bed.daemon().pid();
  const Contender ours{[&] {
                         if (client.search(search).dataSize != size)
                           throw std::runtime_error("an answer of the wrong size");
                       },
                       [process] { return processorTimeOf(process); }};
  const Contender floor{[&] { bare.fetch(); }, [] { return processorTimeOfThisThread(); }};
  Comparison::run(repetitions, ours, floor)
      .report(report, "search, " + std::to_string(size / 1024) + " KiB, " + name, kLimits);
}

}  // namespace

void measureNetworkSearches(const Plan& plan, const SandboxProcess& sandbox, Report& report) {
  ProcessBed bed(sandbox);
  bed.daemon();
  auto client = BusClient::ofPeer(bed.daemonAddress());
  CurlClient bare(sandbox.certificate());
  for (const std::size_t size : {2048, 20480, 204800}) {
    compare({plan.rounds, plan.fetches}, bed, client, bare, searchOfSize(kWithout, size), size,
            report, "loopback");
  }
  compare({plan.rounds, plan.fetches}, bed, client, bare, searchOfSize(kWithImages, 204800), 204800,
          report, "with results and images, loopback");
  sandbox.control("misbehave", kDistance);
  compare({plan.rounds, plan.fetches / 5}, bed, client, bare, searchOfSize(kWithout, 20480), 20480,
          report, "20 ms away");
  sandbox.control("behave");
}

}  // namespace zelkord::bench
