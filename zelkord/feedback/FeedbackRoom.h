#pragma once

#include <deque>
#include <memory>
#include <utility>

#include "base/Mutex.h"
#include "platform/api/Budget.h"
#include "zelkord/feedback/ZelkorFeedback.h"

namespace zelkord {

class Assembly;

// What feedback may hold of what all clients share: the memory of records on their way to the disk,
// and the one-off sessions of a minute, each of which is a file.
//
// A record's holder is the process that caused it; the daemon's own have one holder together.
//
// Threading: any thread. Ownership: the assembly outlives it; what records hold may outlive it.
// Errors: what does not fit is counted and named.
class FeedbackRoom final {
 public:
  // Bytes as _cost tells them: nearly what the record takes.
  static constexpr Budget::Size kWaiting{32 * 1024 * 1024, 8 * 1024 * 1024};
  // As many as there may be files of them: more would only drive each other out.
  static constexpr Budget::Size kOneOffSessions{512, 128};
  static constexpr Duration kOneOffPeriod = std::chrono::seconds(60);

  explicit FeedbackRoom(Assembly& assembly);

  // Lets the record hold on to its share. False when there is no room.
  bool take(ZelkorFeedback& record);
  // Whether there may be another session for one occasion.
  bool takeSession(const ZelkorFeedback& first);
  const Budget& waiting() const { return waiting_; }

 private:
  struct Held {
    Budget::Share share;
    std::shared_ptr<const void> before;
  };
  static std::uint64_t _cost(const ZelkorFeedback& record);

  // Fixed after construction.
  const Clock& clock_;

  // Own synchronisation.
  Budget waiting_;
  Budget sessions_;
  Mutex mutex_;
  std::deque<std::pair<SteadyTime, Budget::Share>> begun_ ZK_GUARDED_BY(mutex_);  // by their ends
};

}  // namespace zelkord
