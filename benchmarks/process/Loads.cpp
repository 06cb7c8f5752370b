#include <algorithm>
#include <array>

#include "benchmarks/process/Crowd.h"
#include "benchmarks/process/Measurements.h"
#include "benchmarks/process/ProcessBed.h"
#include "benchmarks/process/ProcessFacts.h"

namespace zelkord::bench {
namespace {

constexpr std::size_t kWaiting = 64;
constexpr double kBurstLimit = 1200;  // milliseconds
constexpr std::size_t kTyping = 200;
constexpr int kKeysASecond = 5;
constexpr double kTypingLimit = 5;  // milliseconds
// Each client holds a thread for up to a second until the bag is there; threads without work stay
// for five.
constexpr double kTypingThreadLimit = kTyping + 16;
// A client that waits for the bag holds two threads: its search and the delivery of the bag.
constexpr double kWaitingThreadLimit = 2 * kWaiting + 16;

constexpr std::array<const char*, 12> kWords = {"snow",  "france", "letter", "water",
                                                "green", "house",  "river",  "cloud",
                                                "music", "bank",   "paper",  "stone"};

// What the highest values were while something ran.
struct Peaks {
  pid_t process;
  std::int64_t threads = 0;
  double resident = 0;  // MiB

  void look() {
    threads = std::max(threads, threadsOf(process));
    resident = std::max(resident, residentMiBOf(process));
  }
};

// Types words letter by letter, one after the other.
std::string typedText(std::size_t client, std::size_t key) {
  std::size_t word = client % kWords.size();
  while (true) {
    const std::string text = kWords[word % kWords.size()];
    if (key < text.size()) return text.substr(0, key + 1);
    key -= text.size();
    ++word;
  }
}

// Every key has its moment, evenly spread over the clients, whether or not answers have come.
void type(Crowd& crowd, std::chrono::seconds time, Peaks& peaks) {
  const auto start = Clock::now();
  const auto between = std::chrono::nanoseconds(std::chrono::seconds(1)) / (kTyping * kKeysASecond);
  const auto keys = static_cast<std::size_t>(time / between);
  for (std::size_t i = 0; i < keys; ++i) {
    crowd.serveUntil(start + between * i);
    crowd.search(i % kTyping, {.queryString = typedText(i % kTyping, i / kTyping)});
    if (i % 100 == 0) peaks.look();
  }
  crowd.serveUntilAnswered(Clock::now() + std::chrono::seconds(10));
}

}  // namespace

void measureBurst(const Plan&, const SandboxProcess& sandbox, Report& report) {
  sandbox.control("misbehave", R"({"path": "/bag", "count": 0, "delay_ms": 20000})");
  ProcessBed bed(sandbox);
  Peaks peaks{bed.daemon().pid()};
  const auto start = Clock::now();
  Crowd crowd(bed.daemonAddress(), kWaiting);
  for (std::size_t i = 0; i < kWaiting; ++i) crowd.search(i, {.queryString = "snow"});
  while (crowd.pending() > 0 && Clock::now() < start + std::chrono::seconds(20)) {
    peaks.look();
    crowd.serveUntilAnswered(Clock::now() + std::chrono::milliseconds(50));
  }
  const double took = microsecondsSince(start) / 1000;
  report.bound("64 clients without a bag, last answer", took, kBurstLimit, "ms");
  report.bound("64 clients without a bag, not answered", static_cast<double>(crowd.pending()), 0,
               "searches");
  report.bound("64 clients without a bag, threads", static_cast<double>(peaks.threads),
               kWaitingThreadLimit, "threads");
  sandbox.control("behave");
}

void measureTyping(const Plan& plan, const SandboxProcess& sandbox, Report& report) {
  ProcessBed bed(sandbox);
  Peaks peaks{bed.daemon().pid()};
  Crowd crowd(bed.daemonAddress(), kTyping);
  crowd.serveUntilAnswered(Clock::now() + std::chrono::seconds(10));
  crowd.serveUntil(Clock::now() + std::chrono::seconds(1));  // the bag comes
  const double before = processorTimeOf(peaks.process);
  type(crowd, plan.typing, peaks);
  const double busy =
      (processorTimeOf(peaks.process) - before) / 1e4 / static_cast<double>(plan.typing.count());
  const auto lost = static_cast<double>(crowd.errors() + crowd.pending());
  report.bound("200 clients typing, errors", lost, 0, "searches");
  report.plain("200 clients typing, p50", crowd.answers().median(), "ms");
  report.bound("200 clients typing, p99", crowd.answers().percentile(0.99), kTypingLimit, "ms");
  report.bound("200 clients typing, threads", static_cast<double>(peaks.threads),
               kTypingThreadLimit, "threads");
  report.plain("200 clients typing, threads at the end",
               static_cast<double>(threadsOf(peaks.process)), "threads");
  report.plain("200 clients typing, resident memory", peaks.resident, "MiB");
  report.plain("200 clients typing, processor", busy, "% of one");
}

}  // namespace zelkord::bench
