#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <utility>

#include "platform/api/Signals.h"

namespace zelkord {

// Signals that a test raises.
class FakeSignals final : public Signals {
 public:
  Subscription on(int signal, WorkQueue& queue, Task task) override {
    const auto id = ++lastId_;
    handlers_->emplace(id, Handler{signal, &queue, std::make_shared<const Task>(std::move(task))});
    return Subscription([weak = std::weak_ptr(handlers_), id] {
      if (const auto handlers = weak.lock()) handlers->erase(id);
    });
  }
  // Posts the tasks of that signal to their queues.
  void raise(int signal) {
    for (const auto& [id, handler] : *handlers_) {
      if (handler.signal != signal) continue;
      handler.queue->async([weak = std::weak_ptr(handler.task)] {
        if (const auto task = weak.lock()) (*task)();
      });
    }
  }
  bool isHandled(int signal) const {
    for (const auto& [id, handler] : *handlers_) {
      if (handler.signal == signal) return true;
    }
    return false;
  }

 private:
  struct Handler {
    int signal;
    WorkQueue* queue;
    std::shared_ptr<const Task> task;
  };
  using Handlers = std::map<std::uint64_t, Handler>;

  const std::shared_ptr<Handlers> handlers_ = std::make_shared<Handlers>();
  std::uint64_t lastId_ = 0;
};

}  // namespace zelkord
