// Measures the crit-bit tree against other ordered maps, with names that people look for. Prints
// lines for benchmarks/table.py.
//
// usage: zelkord_map_bench [ROUNDS [KEYS]...]

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <random>
#include <stdexcept>
#include <tuple>

#include "benchmarks/maps/Completions.h"
#include "benchmarks/maps/MapContest.h"
#include "benchmarks/maps/Race.h"

namespace {

using namespace zelkord::bench;

// How many small entries a full query cache has: where the tree has to be good.
constexpr std::size_t kAimedSize = 2'048;
constexpr double kLimit = 1.1;  // times the best of the others

Workload workloadOf(std::size_t count) {
  constexpr std::size_t kLookups = 16'384;
  constexpr std::size_t kPrefixes = 2'048;
  Workload workload;
  workload.keys = completions(count);
  workload.prefixes = prefixesOf(workload.keys, kPrefixes, {5, 50});
  std::mt19937 random(1);
  for (std::size_t i = 0; i < kLookups; ++i)
    workload.lookups.push_back(workload.keys[random() % count]);
  for (std::size_t i = 0; i < count; ++i) workload.items.emplace_back(new Item);
  return workload;
}

class Contest {
 public:
  explicit Contest(const Workload& workload)
      : size_(workload.keys.size()), all_(workload, workload, workload, workload) {}

  // `limit` is told but not judged at other sizes than the one aimed at.
  template <typename Work>
  void hold(Report& report, const std::string& what, int rounds, double limit,
            const std::string& unit, const Work& work) {
    Race race;
    std::apply([&](auto&... each) { (race.enter(each.name(), [&] { return work(each); }), ...); },
               all_);
    race.run(rounds);
    race.report(report, what + ", " + std::to_string(size_) + " keys",
                size_ == kAimedSize ? limit : 0, unit);
  }

  void checkThatAllFoundTheSame() const {
    const auto expected = std::get<0>(all_).digest();
    const bool same = std::apply(
        [expected](const auto&... each) { return ((each.digest() == expected) && ...); }, all_);
    if (!same) throw std::runtime_error("the maps do not agree");
  }

 private:
  const std::size_t size_;
  std::tuple<Contestant<TreeMap>, Contestant<BtreeMap>, Contestant<StdMap>,
             Contestant<SortedVector>>
      all_;
};

void measure(std::size_t count, int rounds, Report& report) {
  const auto workload = workloadOf(count);
  Contest contest(workload);
  contest.hold(report, "find", rounds, kLimit, "ns", [](auto& map) { return map.timeFind(); });
  contest.hold(report, "walk over a prefix", rounds, kLimit, "ns",
               [](auto& map) { return map.timeWalk(); });
  contest.hold(report, "insert", rounds, 0, "ns", [](auto& map) { return map.timeInsert(); });
  contest.hold(report, "erase", rounds, 0, "ns", [](auto& map) { return map.timeErase(); });
  contest.hold(report, "memory", 1, 0, "B", [](auto& map) { return map.bytesPerKey(); });
  contest.checkThatAllFoundTheSame();
}

}  // namespace

int main(int count, char** arguments) {
  const int rounds = count > 1 ? std::atoi(arguments[1]) : 15;
  std::vector<std::size_t> sizes;
  for (int i = 2; i < count; ++i) sizes.push_back(std::strtoul(arguments[i], nullptr, 10));
  if (sizes.empty()) sizes = {100, kAimedSize, 100'000};
  try {
    Report report;
    for (const auto size : sizes) measure(size, rounds, report);
  } catch (const std::exception& problem) {
    std::fprintf(stderr, "%s\n", problem.what());
    return EXIT_FAILURE;
  }
  return EXIT_SUCCESS;
}
