#include "platform/api/NotificationCenter.h"

#include <vector>

#include "base/Mutex.h"

namespace zelkord {

struct NotificationCenter::State {
  struct Entry {
    std::uint64_t id;
    const void* object;
    std::shared_ptr<const Observer> observer;
  };
  Mutex mutex;
  std::uint64_t nextId ZK_GUARDED_BY(mutex) = 1;
  std::map<std::string, std::vector<Entry>, std::less<>> observers ZK_GUARDED_BY(mutex);

  void remove(const std::string& name, std::uint64_t id) {
    std::shared_ptr<const Observer> released;  // outlives the lock: its captures may cancel in turn
    const MutexLock lock(mutex);
    const auto found = observers.find(name);
    if (found == observers.end()) return;
    std::erase_if(found->second, [&](Entry& entry) {
      if (entry.id != id) return false;
      released = std::move(entry.observer);
      return true;
    });
    if (found->second.empty()) observers.erase(found);
  }

  std::vector<std::shared_ptr<const Observer>> matching(const Notification& notification) {
    std::vector<std::shared_ptr<const Observer>> result;
    const MutexLock lock(mutex);
    const auto found = observers.find(notification.name);
    if (found == observers.end()) return result;
    for (const auto& entry : found->second) {
      if (!entry.object || entry.object == notification.object) result.push_back(entry.observer);
    }
    return result;
  }
};

NotificationCenter::NotificationCenter() : state_(std::make_shared<State>()) {}
NotificationCenter::~NotificationCenter() = default;

Subscription NotificationCenter::observe(std::string name, Observer observer, const void* object) {
  std::uint64_t id = 0;
  {
    const MutexLock lock(state_->mutex);
    id = state_->nextId++;
    state_->observers[name].push_back(
        {id, object, std::make_shared<const Observer>(std::move(observer))});
  }
  return Subscription([state = std::weak_ptr(state_), name = std::move(name), id] {
    if (const auto alive = state.lock()) alive->remove(name, id);
  });
}

void NotificationCenter::post(const Notification& notification) {
  for (const auto& observer : state_->matching(notification)) (*observer)(notification);
}

}  // namespace zelkord
