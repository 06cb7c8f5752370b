#pragma once

#include <optional>
#include <string>

namespace zelkord::bench {

// One figure of a measurement, and what stands beside it.
struct Row {
  struct Other {
    std::string name;
    double value = 0;
    double ratio = 0;  // our figure in times of its own
  };
  // What ours is to be at most: `limit`, so many times the floor's, or so much more than that.
  enum class Target { None, Value, Ratio, Excess };

  std::string name;
  std::string figure;  // empty when the name says it
  std::string unit;
  double ours = 0;
  std::optional<Other> floor;
  std::optional<Other> second;  // another program that does less than the floor
  Target target = Target::None;
  double limit = 0;
};

// The figures, one line each on standard output as soon as it is known, for benchmarks/table.py:
// the row's fields, each other program's as name, figure and ratio, separated by tabs, "-" for what
// there is not.
class Report {
 public:
  void add(const Row& row);
  // A figure that is to be at most `limit`.
  void bound(const std::string& name, double ours, double limit, const std::string& unit);
  // A figure that is only told.
  void plain(const std::string& name, double ours, const std::string& unit);
};

}  // namespace zelkord::bench
