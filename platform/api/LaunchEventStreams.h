#pragma once

#include <functional>
#include <memory>
#include <string>

#include "platform/api/LaunchEvents.h"

namespace zelkord {

// Launch events within the process: whoever learns of one delivers it, whoever handles its stream
// gets it, in the order of delivery. Events of a stream that nobody handles wait for a handler. A
// stream has one handler; a new one replaces it.
//
// Threading: any thread; a handler runs on its own queue.
// Ownership: a handler's queue outlives its subscription. An event whose handler was cancelled
// before it ran waits for the next handler.
class LaunchEventStreams final : public LaunchEvents {
 public:
  LaunchEventStreams();

  Subscription handle(const std::string& stream, WorkQueue& queue,
                      std::function<void(const std::string& name)> handler) override;
  void deliver(const std::string& stream, std::string name);

 private:
  struct State;
  const std::shared_ptr<State> state_;
};

}  // namespace zelkord
