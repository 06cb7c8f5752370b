#pragma once

#include <functional>
#include <string>
#include <vector>

#include "benchmarks/process/Report.h"

namespace zelkord::bench {

// Some that do the same work, the first of them ours. They take turns, so that all meet the same
// noise; each counts with its lowest figure.
class Race {
 public:
  // `run` does the work once and tells its figure.
  void enter(std::string name, std::function<double()> run);
  void run(int rounds);

  // Ours against the fastest of the others, then each of these.
  void report(Report& report, const std::string& name, double limit, const std::string& unit) const;

 private:
  struct Runner {
    std::string name;
    std::function<double()> run;
    double best = 0;
  };

  std::vector<Runner> runners_;
};

}  // namespace zelkord::bench
