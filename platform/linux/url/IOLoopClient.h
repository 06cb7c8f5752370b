#pragma once

#include "base/Time.h"

namespace zelkord {

// Something that lives on an IOLoop. All operations run on its thread.
class IOLoopClient {
 public:
  static constexpr SteadyTime kNever = SteadyTime::max();

  virtual ~IOLoopClient() = default;
  // The watched descriptor has one of the epoll events.
  virtual void ready(int descriptor, unsigned events) = 0;
  // When runDue is wanted next; kNever: not at all.
  virtual SteadyTime nextDue() const = 0;
  virtual void runDue(SteadyTime now) = 0;
  // The loop ends; the client is removed already.
  virtual void loopEnded() = 0;
};

}  // namespace zelkord
