#include "benchmarks/process/Comparison.h"

#include "benchmarks/process/Waiting.h"

namespace zelkord::bench {
namespace {

constexpr const char* kNames[] = {"p50", "p99", "processor time", "wake-ups"};
constexpr const char* kUnits[] = {"us", "us", "us", "a call"};

// 0 when there is nothing to compare with.
double ratioOf(double ours, double other) { return other > 0 ? ours / other : 0; }

// The row, with that target unless the limit is 0.
Row limited(Row row, Row::Target target, double limit) {
  row.target = limit > 0 ? target : Row::Target::None;
  row.limit = limit;
  return row;
}

}  // namespace

Comparison::Round Comparison::_runRound(const Contender& contender, int repetitions) {
  Samples times;
  const auto before = contender.usage();
  for (int i = 0; i < repetitions; ++i) {
    const auto start = Clock::now();
    contender.work();
    times.add(microsecondsSince(start));
  }
  const auto after = contender.usage();
  const auto sleeps = sumOf(sleepsBetween(before.sleeps, after.sleeps));
  return {times.median(), times.percentile(0.99),
          (after.processor - before.processor) / repetitions,
          static_cast<double>(sleeps) / repetitions};
}

void Comparison::_add(const Round& ours, const std::vector<Round>& others) {
  for (std::size_t figure = 0; figure < Figures; ++figure) {
    ours_[figure].add(ours[figure]);
    for (std::size_t i = 0; i < others.size(); ++i) {
      others_[i].figures[figure].add(others[i][figure]);
      others_[i].ratios[figure].add(ratioOf(ours[figure], others[i][figure]));
    }
  }
}

Comparison Comparison::run(const Size& size, const Contender& ours, const Contender& floor,
                           const Contender* second) {
  std::vector<const Contender*> others = {&floor};
  if (second) others.push_back(second);
  Comparison result;
  for (const auto* other : others) result.others_.push_back({other->name, {}, {}});
  for (int i = 0; i < size.rounds; ++i) {
    const auto our = _runRound(ours, size.repetitions);
    std::vector<Round> rounds;
    for (const auto* other : others) rounds.push_back(_runRound(*other, size.repetitions));
    result._add(our, rounds);
  }
  return result;
}

template <typename Beside>
Row Comparison::_row(Row row, const Beside& beside) const {
  row.floor = beside(others_.front());
  if (others_.size() > 1) row.second = beside(others_.back());
  return row;
}

Row Comparison::_medians(const std::string& name, Figure figure) const {
  return _row({.name = name,
               .figure = kNames[figure],
               .unit = kUnits[figure],
               .ours = ours_[figure].median()},
              [figure](const Other& other) {
                return Row::Other{other.name, other.figures[figure].median(),
                                  other.ratios[figure].median()};
              });
}

Row Comparison::_bestRounds(const std::string& name) const {
  const double ours = ours_[Median].percentile(0);
  return _row({.name = name, .figure = "p50, best rounds", .unit = kUnits[Median], .ours = ours},
              [ours](const Other& other) {
                const double best = other.figures[Median].percentile(0);
                return Row::Other{other.name, best, ratioOf(ours, best)};
              });
}

void Comparison::report(Report& report, const std::string& name, const Limits& limits) const {
  report.add(limited(_medians(name, Median), Row::Target::Ratio, limits.median));
  report.add(limited(_medians(name, WakeUps), Row::Target::Value, limits.wakeUps));
  report.add(_bestRounds(name));
  report.add(limited(_medians(name, Tail), Row::Target::Ratio, limits.tail));
  report.add(limited(_medians(name, Processor), Row::Target::Ratio, limits.processor));
}

}  // namespace zelkord::bench
