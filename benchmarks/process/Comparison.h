#pragma once

#include <array>
#include <cstddef>
#include <string>
#include <vector>

#include "benchmarks/process/Contender.h"
#include "benchmarks/process/Report.h"
#include "benchmarks/process/Samples.h"

namespace zelkord::bench {

// Ours against the floor, and perhaps a second program that does less, in turns so that all meet
// the same noise. Every figure is the median of the rounds' figures, a ratio's too. On a loaded
// machine the best round of each tells more; that is reported beside.
class Comparison {
 public:
  struct Size {
    int rounds;
    int repetitions;  // of each in a round
  };
  // In times of the floor's figures, except the number of wake-ups; 0: told without a target.
  struct Limits {
    double median = 0;
    double tail = 0;  // p99
    double processor = 0;
    double wakeUps = 0;  // of all our threads, for each repetition
  };

  // `second` may be null.
  static Comparison run(const Size& size, const Contender& ours, const Contender& floor,
                        const Contender* second = nullptr);

  void report(Report& report, const std::string& name, const Limits& limits) const;

 private:
  enum Figure : std::size_t { Median, Tail, Processor, WakeUps, Figures };
  using Round = std::array<double, Figures>;
  struct Other {
    std::string name;
    std::array<Samples, Figures> figures, ratios;
  };

  static Round _runRound(const Contender& contender, int repetitions);
  void _add(const Round& ours, const std::vector<Round>& others);
  // The row with what `beside` makes of each other.
  template <typename Beside>
  Row _row(Row row, const Beside& beside) const;
  Row _medians(const std::string& name, Figure figure) const;
  Row _bestRounds(const std::string& name) const;

  std::array<Samples, Figures> ours_;
  std::vector<Other> others_;  // the floor first
};

}  // namespace zelkord::bench
