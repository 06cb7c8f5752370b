#include <algorithm>
#include <array>
#include <sstream>
#include <stdexcept>
#include <vector>

#include "benchmarks/process/BusClient.h"
#include "benchmarks/process/Comparison.h"
#include "benchmarks/process/CurlClient.h"
#include "benchmarks/process/Measurements.h"
#include "benchmarks/process/ProcessBed.h"

namespace zelkord::bench {
namespace {

constexpr Comparison::Limits kLimits{.median = 1.5, .processor = 2, .wakeUps = 2};

// How far away services are in practice; the loopback alone shows our own microseconds enlarged.
constexpr const char* kDistance = R"({"path": "/search", "count": 0, "delay_ms": 20})";

// Names countries: the answer has images, whose hosts the daemon learns, and result sets, which it
// keeps.
constexpr const char* kWithImages = "fr";
// Means nothing, so the answer has next to nothing but its size.
constexpr const char* kWithout = "xqzvw";

constexpr std::array<std::size_t, 3> kSizes = {2'048, 20'480, 204'800};

// The item keeps the answer out of the daemon's cache and gives it its size.
Search searchOfSize(const std::string& text, std::size_t size) {
  return {.queryString = text, .queryItems = {{"pad", std::to_string(size)}}};
}

// The URL of a search without what the client asked for.
std::string withoutItems(const std::string& url) {
  constexpr std::array<const char*, 2> kAsked = {"q", "pad"};
  const auto query = url.find('?') + 1;
  auto rest = url.substr(0, query);
  std::istringstream items(url.substr(query));
  for (std::string item; std::getline(items, item, '&');) {
    if (std::ranges::find(kAsked, item.substr(0, item.find('='))) != kAsked.end()) continue;
    if (rest.size() > query) rest += '&';
    rest += item;
  }
  return rest;
}

std::vector<std::string> linesOf(const CurlClient::Headers& headers) {
  std::vector<std::string> lines;
  for (const auto& [name, value] : headers) lines.push_back(name + ": " + value);
  return lines;
}

void expectSize(std::size_t expected, std::size_t size, const char* whose) {
  if (size != expected)
    throw std::runtime_error(std::string(whose) + ": a body of " + std::to_string(size) + " bytes");
}

// The daemon, the minimal broker and a bare client, all of which send the service the same request.
class Contest {
 public:
  Contest(ProcessBed& bed, const SandboxProcess& sandbox)
      : daemon_(bed.daemon().pid()),
        client_(BusClient::ofPeer(bed.daemonAddress())),
        bare_(sandbox.certificate()),
        broker_(_startBroker(bed)),
        brokerClient_(BusClient::ofPeer(bed.floorAddress())) {}

  void hold(const Comparison::Size& repetitions, const Search& search, std::size_t size,
            Report& report, const std::string& name) {
    auto verbose = search;
    verbose.verbose = true;
    const auto first = client_.firstSearch(verbose);
    bare_.prepare(first.url, first.headers);
    const auto asking = [&search, size](BusClient& client, const char* whose) {
      return [&client, &search, size, whose] {
        expectSize(size, client.search(search).dataSize, whose);
      };
    };
    const auto ours = Contender::process("ours", daemon_, asking(client_, "ours"));
    const auto floor = Contender::process("broker", broker_, asking(brokerClient_, "broker"));
    const auto bare = Contender::thisThread(
        "bare client", [this, size] { expectSize(size, bare_.fetch(), "bare client"); });
    for (const auto* contender : {&ours, &floor, &bare}) contender->work();  // connects
    Comparison::run(repetitions, ours, floor, &bare)
        .report(report, "search, " + std::to_string(size / 1024) + " KiB, " + name, kLimits);
  }

 private:
  pid_t _startBroker(ProcessBed& bed) {
    auto search = searchOfSize(kWithout, kSizes.front());
    search.verbose = true;
    const auto first = client_.firstSearch(search);
    return bed.broker(withoutItems(first.url), linesOf(first.headers)).pid();
  }

  const pid_t daemon_;
  BusClient client_;
  CurlClient bare_;
  const pid_t broker_;
  BusClient brokerClient_;
};

}  // namespace

void measureNetworkSearches(const Plan& plan, const SandboxProcess& sandbox, Report& report) {
  ProcessBed bed(sandbox);
  Contest contest(bed, sandbox);
  const Comparison::Size here{plan.rounds, plan.fetches};
  const Comparison::Size away{plan.rounds, plan.fetches / 5};
  for (const auto size : kSizes)
    contest.hold(here, searchOfSize(kWithout, size), size, report, "loopback");
  contest.hold(here, searchOfSize(kWithImages, kSizes.back()), kSizes.back(), report,
               "with results and images, loopback");
  sandbox.control("misbehave", kDistance);
  for (const auto size : kSizes)
    contest.hold(away, searchOfSize(kWithout, size), size, report, "20 ms away");
  sandbox.control("behave");
}

}  // namespace zelkord::bench
