#pragma once

#include <string>

namespace zelkord::bench {

// The figures, one line each on standard output as soon as it is known: name, ours, floor, ratio,
// target and verdict, separated by tabs, "-" for what there is not.
class Report {
 public:
  // A figure that is to be at most `limit` times its floor; 0 means that it is only told.
  void ratio(const std::string& name, double ours, double floor, double ratio, double limit,
             const std::string& unit);
  // A figure that is to be at most `limit`.
  void bound(const std::string& name, double ours, double limit, const std::string& unit);
  // A figure that is to be at most its floor and `limit` more.
  void excess(const std::string& name, double ours, double floor, double limit,
              const std::string& unit);
  // A figure that is only told.
  void plain(const std::string& name, double ours, const std::string& unit);
};

}  // namespace zelkord::bench
