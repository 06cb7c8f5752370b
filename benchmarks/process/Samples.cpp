#include "benchmarks/process/Samples.h"

#include <algorithm>

namespace zelkord::bench {

double Samples::percentile(double share) const {
  if (values_.empty()) return 0;
  const auto index = static_cast<std::size_t>(share * static_cast<double>(values_.size()));
  const auto place = values_.begin() + static_cast<std::ptrdiff_t>(std::min(index, size() - 1));
  std::nth_element(values_.begin(), place, values_.end());
  return *place;
}

}  // namespace zelkord::bench
