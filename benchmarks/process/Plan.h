#pragma once

#include <chrono>
#include <string>
#include <vector>

namespace zelkord::bench {

// How long the measurements take. The command line changes it.
struct Plan {
  int rounds = 9;
  int roundTrips = 1500;  // in a round
  int fetches = 150;      // in a round
  int starts = 9;
  std::chrono::seconds settling{25};  // until the daemon has done what starting brings with it
  std::chrono::seconds idle{60};
  std::chrono::seconds typing{20};
  std::string only;  // empty: everything

  bool includes(const std::string& name) const { return only.empty() || only == name; }
};

// usage: [--quick] [--idle SECONDS] [--only NAME]. Throws std::runtime_error for anything else.
Plan parsePlan(const std::vector<std::string>& arguments);

}  // namespace zelkord::bench
