// usage: zelkord_soak --address ADDRESS --words FILE [--clients N] [--keystrokes N] [--pause MS]
//                     [--seed N] [--daemon PID] [--growth-limit MIB] [--seconds N] [--latency-limit
//                     MS]
//
// Simulated clients at a daemon's private door, in two halves with the same load. Status 0 when
// every question was answered exactly once, or not for a reason that can be seen from outside, the
// daemon is not larger after the second half than after the first one, and 99 of 100 searches had
// their data within the limit. With --seconds the halves end after that time instead. With
// --strict yes the service is known to behave: every error is a fault.

#include <fmt/core.h>

#include <algorithm>
#include <fstream>
#include <functional>
#include <limits>
#include <stdexcept>
#include <thread>

#include "tests/soak/TypingClient.h"

namespace zelkord::soak {
namespace {

constexpr std::chrono::seconds kLastAnswers{150};
constexpr std::chrono::seconds kSettling{3};

struct Options {
  std::string address;
  std::string words;
  std::size_t clients = 20;
  std::int64_t keystrokes = 100'000;
  int pause = 20;
  unsigned seed = std::random_device()();
  int daemon = 0;
  double growthLimit = 6;   // MiB
  double latencyLimit = 0;  // ms of the 99th percentile; 0: none
  int seconds = 0;          // 0: keystrokes end it
  bool strict = false;
};

Options parse(int count, char** arguments) {
  Options options;
  const std::map<std::string, std::function<void(const std::string&)>> known = {
      {"--address", [&](const auto& text) { options.address = text; }},
      {"--words", [&](const auto& text) { options.words = text; }},
      {"--clients", [&](const auto& text) { options.clients = std::stoul(text); }},
      {"--keystrokes", [&](const auto& text) { options.keystrokes = std::stoll(text); }},
      {"--pause", [&](const auto& text) { options.pause = std::stoi(text); }},
      {"--seed", [&](const auto& text) { options.seed = std::stoul(text); }},
      {"--daemon", [&](const auto& text) { options.daemon = std::stoi(text); }},
      {"--seconds", [&](const auto& text) { options.seconds = std::stoi(text); }},
      {"--strict", [&](const auto& text) { options.strict = text == "yes"; }},
      {"--latency-limit", [&](const auto& text) { options.latencyLimit = std::stod(text); }},
      {"--growth-limit", [&](const auto& text) { options.growthLimit = std::stod(text); }}};
  for (int i = 1; i + 1 < count; i += 2) known.at(arguments[i])(arguments[i + 1]);
  if (count % 2 == 0 || options.address.empty() || options.words.empty()) {
    throw std::out_of_range("an option is missing");
  }
  return options;
}

// Memory of its own, without what it maps of files, in MiB; 0 when there is no such process.
double residentSize(int process) {
  std::ifstream file(fmt::format("/proc/{}/status", process));
  for (std::string word; file >> word;) {
    if (word == "RssAnon:" && file >> word) return std::stod(word) / 1024;
  }
  return 0;
}

using Clients = std::vector<std::unique_ptr<TypingClient>>;

// Waits for something to happen until `end`, and handles it.
void serve(const Clients& clients, SteadyClock::time_point end) {
  std::vector<pollfd> descriptors;
  for (const auto& client : clients) descriptors.push_back(client->waiting());
  const auto left = std::chrono::ceil<std::chrono::milliseconds>(end - SteadyClock::now()).count();
  ::poll(descriptors.data(), descriptors.size(), static_cast<int>(std::max<std::int64_t>(left, 0)));
  for (const auto& client : clients) client->process();
}

struct End {
  std::int64_t keystrokes;
  SteadyClock::time_point time;
};

void typeUntil(const Clients& clients, const Tally& tally, const End& end) {
  while (tally.keystrokes < end.keystrokes && SteadyClock::now() < end.time &&
         tally.faults.size() < 20) {
    auto next = SteadyClock::time_point::max();
    for (const auto& client : clients) {
      if (client->nextAct() <= SteadyClock::now()) client->act();
      next = std::min(next, client->nextAct());
    }
    serve(clients, next);
  }
}

void collectAnswers(const Clients& clients, Tally& tally) {
  const auto pending = [&] {
    return std::ranges::any_of(clients, [](const auto& client) { return client->pending() > 0; });
  };
  const auto end = SteadyClock::now() + kLastAnswers;
  while (pending() && SteadyClock::now() < end) {
    serve(clients, std::min(end, SteadyClock::now() + std::chrono::milliseconds(100)));
  }
  for (const auto& client : clients) {
    if (client->pending() > 0) tally.faults["never answered"] += client->pending();
  }
}

// One half of the run; gives the daemon's size when all clients are gone.
double runHalf(const Options& options, const Words& words, Tally& tally, const End& end) {
  {
    Clients clients;
    for (std::size_t i = 0; i < options.clients; ++i) {
      TypingClient::Habits habits{options.address, "com.quenta.soak" + std::to_string(i % 5),
                                  std::chrono::milliseconds(options.pause), options.strict};
      const auto seed = options.seed + static_cast<unsigned>(i + tally.keystrokes);
      clients.push_back(std::make_unique<TypingClient>(std::move(habits), words, tally, seed));
    }
    typeUntil(clients, tally, end);
    collectAnswers(clients, tally);
  }
  std::this_thread::sleep_for(kSettling);
  return residentSize(options.daemon);
}

End endOfHalf(const Options& options, int half) {
  if (options.seconds == 0) {
    return {options.keystrokes * half / 2, SteadyClock::time_point::max()};
  }
  return {std::numeric_limits<std::int64_t>::max(),
          SteadyClock::now() + std::chrono::milliseconds(options.seconds * 500)};
}

int run(const Options& options) {
  const Words words(options.words);
  Tally tally;
  fmt::print("seed {}\n", options.seed);
  const auto begin = SteadyClock::now();
  const double first = runHalf(options, words, tally, endOfHalf(options, 1));
  const double second = runHalf(options, words, tally, endOfHalf(options, 2));
  const auto seconds = std::chrono::duration<double>(SteadyClock::now() - begin).count();
  fmt::print("{} keystrokes and {} questions by {} clients in {:.0f} s\n", tally.keystrokes,
             tally.asked, options.clients, seconds);
  fmt::print("answered {}, stale {}, with nothing {}, connection closed {}\n", tally.answered,
             tally.stale, tally.withoutAnswer, tally.disconnected);
  for (const auto& [error, times] : tally.errors) fmt::print("error {}: {}\n", error, times);
  fmt::print("daemon {:.1f} MiB after the first half, {:.1f} after the second\n", first, second);
  const auto p99 = tally.latency(0.99);
  fmt::print("searches with data: p50 {:.1f} ms, p99 {:.1f} ms, longest {:.1f} ms\n",
             tally.latency(0.5), p99, tally.latency(1));
  if (options.latencyLimit > 0 && (p99 == 0 || p99 >= options.latencyLimit))
    ++tally.faults["searches are slow"];
  if (tally.ended() != tally.asked) ++tally.faults["questions and endings do not add up"];
  if (second > first + options.growthLimit) ++tally.faults["the daemon has grown"];
  for (const auto& [fault, times] : tally.faults) fmt::print("FAULT {}: {}\n", fault, times);
  return tally.faults.empty() ? 0 : 1;
}

}  // namespace
}  // namespace zelkord::soak

int main(int count, char** arguments) {
  try {
    return zelkord::soak::run(zelkord::soak::parse(count, arguments));
  } catch (const std::exception& problem) {
    fmt::print(stderr, "zelkord_soak: {}\n", problem.what());
    return 2;
  }
}
