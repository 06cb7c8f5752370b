#include "benchmarks/maps/Race.h"

#include <algorithm>
#include <utility>

namespace zelkord::bench {

void Race::enter(std::string name, std::function<double()> run) {
  runners_.push_back({std::move(name), std::move(run)});
}

void Race::run(int rounds) {
  for (int round = 0; round < rounds; ++round) {
    for (auto& runner : runners_) {
      const double time = runner.run();
      runner.best = round == 0 ? time : std::min(runner.best, time);
    }
  }
}

void Race::report(Report& report, const std::string& name, double limit,
                  const std::string& unit) const {
  const auto& ours = runners_.front();
  const auto fastest =
      std::min_element(runners_.begin() + 1, runners_.end(),
                       [](const auto& a, const auto& b) { return a.best < b.best; });
  report.add({.name = name,
              .unit = unit,
              .ours = ours.best,
              .floor = Row::Other{fastest->name, fastest->best, ours.best / fastest->best},
              .target = limit > 0 ? Row::Target::Ratio : Row::Target::None,
              .limit = limit});
  for (auto runner = runners_.begin() + 1; runner != runners_.end(); ++runner) {
    report.plain(name + ", " + runner->name, runner->best, unit);
  }
}

}  // namespace zelkord::bench
