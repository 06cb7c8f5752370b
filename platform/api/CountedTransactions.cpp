#include "platform/api/CountedTransactions.h"

#include <utility>

namespace zelkord {

struct CountedTransactions::State {
  explicit State(const Clock& ticking) : clock(ticking), idleSince(ticking.now()) {}

  void close(const std::string& name) {
    std::function<void()> task;
    {
      const MutexLock lock(mutex);
      const auto place = open.find(name);
      if (--place->second == 0) open.erase(place);
      if (!open.empty()) return;
      idleSince = clock.now();
      task = std::exchange(whenIdle, nullptr);
    }
    if (task) task();
  }

  const Clock& clock;
  mutable Mutex mutex;
  std::map<std::string, int> open ZK_GUARDED_BY(mutex);
  SteadyTime idleSince ZK_GUARDED_BY(mutex);
  std::function<void()> whenIdle ZK_GUARDED_BY(mutex);
};

CountedTransactions::CountedTransactions(const Clock& clock)
    : state_(std::make_shared<State>(clock)) {}

Transaction CountedTransactions::open(std::string name) {
  {
    const MutexLock lock(state_->mutex);
    ++state_->open[name];
  }
  return Transaction([weak = std::weak_ptr(state_), name = std::move(name)] {
    if (const auto state = weak.lock()) state->close(name);
  });
}

std::vector<std::string> CountedTransactions::openNames() const {
  std::vector<std::string> names;
  const MutexLock lock(state_->mutex);
  for (const auto& [name, count] : state_->open) {
    names.insert(names.end(), static_cast<std::size_t>(count), name);
  }
  return names;
}

std::optional<SteadyTime> CountedTransactions::idleSince() const {
  const MutexLock lock(state_->mutex);
  if (!state_->open.empty()) return std::nullopt;
  return state_->idleSince;
}

void CountedTransactions::whenIdle(std::function<void()> task) {
  std::function<void()> replaced;
  {
    const MutexLock lock(state_->mutex);
    if (!state_->open.empty()) {
      replaced = std::exchange(state_->whenIdle, std::move(task));
      return;
    }
  }
  task();
}

}  // namespace zelkord
