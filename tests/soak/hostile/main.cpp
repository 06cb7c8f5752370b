// usage: zelkord_hostile --socket PATH --state FOLDER --hostile URL --kept URL --seconds N
//                        [--only TEXT]
//
// A process that attacks the daemon in every way at once, or in those ways whose names contain
// TEXT, each on a thread of its own, for that long. Prints what each attack got through; status 1
// when one of them did nothing at all.

#include <fmt/core.h>
#include <sys/resource.h>

#include <atomic>
#include <map>
#include <stdexcept>
#include <thread>

#include "tests/soak/hostile/Attack.h"
#include "tests/soak/hostile/StalledHost.h"

namespace zelkord::soak {

std::vector<std::unique_ptr<Attack>> allAttacks(const Aim& aim) {
  std::vector<std::unique_ptr<Attack>> all;
  for (auto make : {connectionAttacks, callAttacks, feedbackAttacks, fileAttacks}) {
    for (auto& attack : make(aim)) all.push_back(std::move(attack));
  }
  return all;
}

namespace {

using Clock = std::chrono::steady_clock;

std::uint64_t attackUntil(Clock::time_point end, Attack& attack) {
  std::uint64_t done = 0;
  while (Clock::now() < end) {
    done += attack.round();
    const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(end - Clock::now());
    if (left.count() > 0) std::this_thread::sleep_for(std::min(attack.rest(), left));
  }
  return done;
}

void raiseDescriptorLimit() {
  rlimit limit{};
  ::getrlimit(RLIMIT_NOFILE, &limit);
  limit.rlim_cur = limit.rlim_max;
  ::setrlimit(RLIMIT_NOFILE, &limit);
}

std::map<std::string, std::string> optionsOf(int count, char** arguments) {
  std::map<std::string, std::string> options;
  for (int i = 1; i + 1 < count; i += 2) options[arguments[i]] = arguments[i + 1];
  for (const char* needed : {"--socket", "--state", "--hostile", "--kept", "--seconds"}) {
    if (!options.contains(needed)) throw std::out_of_range(std::string(needed) + " is missing");
  }
  return options;
}

int run(const std::map<std::string, std::string>& options) {
  raiseDescriptorLimit();
  const StalledHost stalled;
  auto attacks = allAttacks({options.at("--socket"), options.at("--state"), stalled.url(),
                             options.at("--hostile"), options.at("--kept")});
  if (const auto only = options.find("--only"); only != options.end()) {
    std::erase_if(attacks, [&](const auto& attack) {
      return std::string_view(attack->name()).find(only->second) == std::string_view::npos;
    });
  }
  const auto end = Clock::now() + std::chrono::seconds(std::stoul(options.at("--seconds")));
  std::vector<std::uint64_t> done(attacks.size());
  std::vector<std::thread> threads;
  for (std::size_t i = 0; i < attacks.size(); ++i) {
    threads.emplace_back([&, i] { done[i] = attackUntil(end, *attacks[i]); });
  }
  for (auto& thread : threads) thread.join();
  bool idle = false;
  for (std::size_t i = 0; i < attacks.size(); ++i) {
    fmt::print("{:>12} {}\n", done[i], attacks[i]->name());
    idle = idle || done[i] == 0;
  }
  return idle ? 1 : 0;
}

}  // namespace
}  // namespace zelkord::soak

int main(int count, char** arguments) {
  try {
    return zelkord::soak::run(zelkord::soak::optionsOf(count, arguments));
  } catch (const std::exception& problem) {
    fmt::print(stderr, "zelkord_hostile: {}\n", problem.what());
    return 2;
  }
}
