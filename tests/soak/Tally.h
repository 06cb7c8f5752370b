#pragma once

#include <algorithm>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

namespace zelkord::soak {

// What became of the questions, and what should not have happened.
struct Tally {
  std::int64_t keystrokes = 0;
  std::int64_t asked = 0;
  std::int64_t answered = 0;                   // with data
  std::int64_t stale = 0;                      // with nothing, a newer query being under way
  std::int64_t withoutAnswer = 0;              // with nothing, as a failed page or card is
  std::int64_t disconnected = 0;               // their connection was closed meanwhile
  std::map<std::string, std::int64_t> errors;  // "domain code", by count
  std::map<std::string, std::int64_t> faults;  // what should not have happened, by count
  std::vector<double> milliseconds;            // from each search to its data

  std::int64_t ended() const {
    std::int64_t sum = answered + stale + withoutAnswer + disconnected;
    for (const auto& entry : errors) sum += entry.second;
    return sum;
  }
  // What that share of the searches took at most, in milliseconds; 0 without any. Sorts them.
  double latency(double share) {
    if (milliseconds.empty()) return 0;
    std::ranges::sort(milliseconds);
    return milliseconds[static_cast<std::size_t>(share *
                                                 static_cast<double>(milliseconds.size() - 1))];
  }
};

}  // namespace zelkord::soak
