#include "benchmarks/process/Comparison.h"

#include "benchmarks/process/Waiting.h"

namespace zelkord::bench {
namespace {

struct Round {
  Samples times;
  double processor = 0;  // per repetition
};

Round runRound(const Contender& contender, int repetitions) {
  Round round;
  const double before = contender.processorTime();
  for (int i = 0; i < repetitions; ++i) {
    const auto start = Clock::now();
    contender.work();
    round.times.add(microsecondsSince(start));
  }
  round.processor = (contender.processorTime() - before) / repetitions;
  return round;
}

}  // namespace

void Comparison::Figure::add(double oursValue, double floorValue) {
  ours.add(oursValue);
  floor.add(floorValue);
  ratio.add(oursValue / floorValue);
}

Comparison Comparison::run(const Size& size, const Contender& ours, const Contender& floor) {
  Comparison result;
  for (int i = 0; i < size.rounds; ++i) {
    const auto our = runRound(ours, size.repetitions);
    const auto bare = runRound(floor, size.repetitions);
    result.median_.add(our.times.median(), bare.times.median());
    result.tail_.add(our.times.percentile(0.99), bare.times.percentile(0.99));
    result.processor_.add(our.processor, bare.processor);
  }
  return result;
}

void Comparison::report(Report& report, const std::string& name, const Limits& limits) const {
  _report(report, name + " p50", median_, limits.median);
  const double ours = median_.ours.percentile(0);
  const double floor = median_.floor.percentile(0);
  report.ratio(name + " p50, best rounds", ours, floor, ours / floor, 0, "us");
  _report(report, name + " p99", tail_, limits.tail);
  _report(report, name + " processor time", processor_, limits.processor);
}

void Comparison::_report(Report& report, const std::string& name, const Figure& figure,
                         double limit) {
  report.ratio(name, figure.ours.median(), figure.floor.median(), figure.ratio.median(), limit,
               "us");
}

}  // namespace zelkord::bench
