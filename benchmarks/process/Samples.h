#pragma once

#include <cstddef>
#include <vector>

namespace zelkord::bench {

// Measured values of one kind.
class Samples {
 public:
  void add(double value) { values_.push_back(value); }
  std::size_t size() const { return values_.size(); }
  // The value below which `share` (0 to 1) of the others lie; 0 without any.
  double percentile(double share) const;
  double median() const { return percentile(0.5); }

 private:
  mutable std::vector<double> values_;
};

}  // namespace zelkord::bench
