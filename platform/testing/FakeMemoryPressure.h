#pragma once

#include <functional>
#include <map>
#include <memory>

#include "platform/api/MemoryPressure.h"

namespace zelkord {

// Memory pressure that a test raises.
// Threading: the test's thread.
class FakeMemoryPressure final : public MemoryPressure {
 public:
  Subscription onCritical(WorkQueue& queue, Task task) override {
    const auto id = nextId_++;
    (*sources_)[id] = [&queue, task = std::move(task)] { queue.async(task); };
    return Subscription([sources = sources_, id] { sources->erase(id); });
  }

  void raise() {
    const auto sources = *sources_;
    for (const auto& [id, raise] : sources) raise();
  }
  std::size_t sourceCount() const { return sources_->size(); }

 private:
  int nextId_ = 0;
  const std::shared_ptr<std::map<int, std::function<void()>>> sources_ =
      std::make_shared<std::map<int, std::function<void()>>>();
};

}  // namespace zelkord
