#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace zelkord::soak {

// What the attacks are aimed at.
struct Aim {
  std::string socket;       // path of the daemon's socket
  std::string stateFolder;  // the daemon's, empty: leave its files alone
  std::string stalledURL;   // takes connections and never answers
  std::string hostileURL;   // answers with what makes the daemon complain
  std::string keptURL;      // with a number behind it: a large answer that may be kept
};

// One way to use up what all clients share.
//
// Threading: one thread of its own. Errors: being refused is an ordinary outcome.
class Attack {
 public:
  virtual ~Attack() = default;
  virtual const char* name() const = 0;
  // How long to rest between two rounds; the processors are shared with those who are measured.
  virtual std::chrono::milliseconds rest() const = 0;
  // Goes at it once, for a few seconds at most. Gives how many things it got through or was
  // refused.
  virtual std::uint64_t round() = 0;
};

// All of them, on `aim`.
std::vector<std::unique_ptr<Attack>> allAttacks(const Aim& aim);

// By what they use up.
std::vector<std::unique_ptr<Attack>> connectionAttacks(const Aim& aim);
std::vector<std::unique_ptr<Attack>> callAttacks(const Aim& aim);
std::vector<std::unique_ptr<Attack>> feedbackAttacks(const Aim& aim);
std::vector<std::unique_ptr<Attack>> fileAttacks(const Aim& aim);

}  // namespace zelkord::soak
