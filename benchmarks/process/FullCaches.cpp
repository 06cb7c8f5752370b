#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <stdexcept>
#include <thread>
#include <vector>

#include "benchmarks/process/BusClient.h"
#include "benchmarks/process/Measurements.h"
#include "benchmarks/process/ProcessBed.h"
#include "benchmarks/process/ProcessFacts.h"
#include "benchmarks/process/Samples.h"
#include "benchmarks/process/Waiting.h"

namespace zelkord::bench {
namespace {

constexpr std::array<std::size_t, 3> kStates = {1, 10, 50};
constexpr int kHits = 3'000;
// By then the daemon has given back what only its start needed.
constexpr std::chrono::seconds kStart{3};

// An answer's size; a cache counts 1,024 bytes more for each. One takes less than 2 MiB, all of a
// process, and ours are one's, at most 16 MiB.
constexpr std::size_t kBody = 20'480;
constexpr std::size_t kCache = 2'097'151;
constexpr std::size_t kProcess = 16'777'216;

// How many answers fit into each cache.
std::size_t roomFor(std::size_t states) {
  return std::min(kCache, kProcess / states) / (kBody + 1'024);
}

std::string textOf(std::size_t number) {
  return {static_cast<char>('a' + number % 26), static_cast<char>('a' + number / 26)};
}

// One completion of the text in an answer of that size.
std::string answerTo(const std::string& text) {
  const auto head = R"([{"status": "OK", "query": ")" + text + R"(ward", "pad": ")";
  const std::string tail = "\"}]";
  return head + std::string(kBody - head.size() - tail.size(), 'p') + tail;
}

std::string quoted(const std::string& text) {
  std::string quoted;
  for (const char c : text) {
    if (c == '"') quoted += '\\';
    quoted += c;
  }
  return '"' + quoted + '"';
}

void fill(std::vector<BusClient>& clients, const SandboxProcess& sandbox) {
  for (std::size_t i = 0; i < roomFor(clients.size()); ++i) {
    const auto text = textOf(i);
    sandbox.control("misbehave",
                    R"({"path": "/search", "count": 0, "body": )" + quoted(answerTo(text)) + "}");
    for (auto& client : clients) client.firstSearch({.queryString = text});
    sandbox.control("behave");
  }
}

// From call to answer, in microseconds, of searches that all clients ask in turn.
Samples hits(std::vector<BusClient>& clients) {
  Samples samples;
  const auto texts = roomFor(clients.size());
  for (std::size_t i = 0; i < kHits; ++i) {
    auto& client = clients[i % clients.size()];
    const Search search{.queryString = textOf(i / clients.size() % texts)};
    const auto start = Clock::now();
    const auto answer = client.search(search);
    samples.add(microsecondsSince(start));
    if (answer.dataSize != kBody) throw std::runtime_error("an answer that is not the cache's");
  }
  return samples;
}

void measure(std::size_t states, const SandboxProcess& sandbox, Report& report) {
  ProcessBed bed(sandbox);
  const auto process = bed.daemon().pid();
  std::this_thread::sleep_for(kStart);
  std::vector<BusClient> clients;
  for (std::size_t i = 0; i < states; ++i) {
    clients.push_back(
        BusClient::ofPeer(bed.daemonAddress(), "com.quenta.benchmark" + std::to_string(i)));
  }
  fill(clients, sandbox);
  const auto samples = hits(clients);
  const auto name = fmt::format("{} client states with full caches", states);
  report.plain(name + ", hit p50", samples.median(), "us");
  report.plain(name + ", hit p99", samples.percentile(0.99), "us");
  report.plain(name + ", resident memory", residentMiBOf(process), "MiB");
}

}  // namespace

void measureFullCaches(const Plan&, const SandboxProcess& sandbox, Report& report) {
  for (const auto states : kStates) measure(states, sandbox, report);
}

}  // namespace zelkord::bench
