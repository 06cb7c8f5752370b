#pragma once

#include <poll.h>

#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <random>
#include <set>
#include <string>

#include "corezelkor/Messages.h"
#include "corezelkor/client/internal/BusPointers.h"
#include "tests/soak/Tally.h"
#include "tests/soak/Words.h"

namespace zelkord::soak {

using SteadyClock = std::chrono::steady_clock;

// Somebody who types real words at the private door, looks at a card, a page or a definition now
// and then, and sometimes hangs up in the middle.
//
// Every question is held against what may become of it: answered once with data, with a known
// error, or with nothing for a reason that this client can see. Anything else is a fault.
//
// Threading: one thread. Ownership: tally and words outlive it. Errors: a connection that fails is
// a fault.
class TypingClient {
 public:
  struct Habits {
    std::string address;
    std::string identifier;
    std::chrono::microseconds pause;  // between keystrokes, on average
    // Whether the service behaves: then a search always has data or a newer one under way.
    bool strict = false;
  };

  TypingClient(Habits habits, const Words& words, Tally& tally, unsigned seed);
  ~TypingClient();
  TypingClient(const TypingClient&) = delete;
  TypingClient& operator=(const TypingClient&) = delete;

  SteadyClock::time_point nextAct() const { return nextAct_; }
  // The next keystroke, or what follows a finished word.
  void act();
  // Hangs up: what is under way is not answered any more.
  void disconnect();

  pollfd waiting() const;
  void process();
  std::size_t pending() const { return pending_.size(); }

 private:
  struct Question;

  void _connect();
  void _cannotConnect(int problem);
  void _finishWord();
  void _search();
  void _ask(std::shared_ptr<zelkor::ZLKRequest> request);
  void _send(zelkor::MessagePointer call, bool isSearch);
  void _ended(Question& question, sd_bus_message* reply);
  void _judge(const Question& question, sd_bus_message* reply);
  void _fault(const std::string& what) { ++tally_.faults[what]; }

  const Habits habits_;
  const Words& words_;
  Tally& tally_;
  std::mt19937 random_;

  zelkor::BusPointer bus_;
  std::set<std::unique_ptr<Question>> pending_;
  std::int64_t queryId_ = 0;
  std::string word_;
  std::size_t typed_ = 0;
  SteadyClock::time_point nextAct_ = SteadyClock::now();
  std::optional<SteadyClock::time_point> turnedAway_;  // since when there has been no place
};

}  // namespace zelkord::soak
