#pragma once

#include <functional>
#include <string>

#include "benchmarks/process/Report.h"
#include "benchmarks/process/Samples.h"

namespace zelkord::bench {

// One of the two that are compared: what is timed, and the processor time so far of whoever does
// the work, in microseconds.
struct Contender {
  std::function<void()> work;
  std::function<double()> processorTime;
};

// Ours against the floor, in turns so that both meet the same noise. Every figure is the median of
// the rounds' figures, a ratio's too. On a loaded machine the best round of each tells more; that
// is reported beside.
class Comparison {
 public:
  struct Size {
    int rounds;
    int repetitions;  // of each in a round
  };
  struct Limits {
    double median;
    double tail;       // p99; 0: told without a target
    double processor;  // 0: told without a target
  };

  static Comparison run(const Size& size, const Contender& ours, const Contender& floor);

  void report(Report& report, const std::string& name, const Limits& limits) const;

 private:
  struct Figure {
    Samples ours, floor, ratio;
    void add(double oursValue, double floorValue);
  };
  static void _report(Report& report, const std::string& name, const Figure& figure, double limit);

  Figure median_, tail_, processor_;
};

}  // namespace zelkord::bench
