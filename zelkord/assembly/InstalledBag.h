#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>

#include "base/Error.h"
#include "base/FunctionRef.h"
#include "base/Mutex.h"
#include "base/Subscription.h"
#include "corezelkor/ZLKBag.h"
#include "platform/api/NotificationCenter.h"
#include "platform/api/WorkQueues.h"

namespace zelkord {

using BagPointer = std::shared_ptr<const ZLKBag>;

enum class BagOrigin { Network, Disk };

enum class BagNews {
  Present,  // the bag in force as the observation begins; null: none yet
  Change,   // from now on it is this one
  Failure,  // a fetch failed, so nothing changes; null
};

// The bag in force: a value with a present.
//
// None at first, from the first installation on always one. Each change and each failure is posted
// as "ZLKBagChangeNotification"; `observe` tells the same, after what is in force as it begins:
// whoever observes has missed nothing, and hears nothing twice or out of order.
//
// Threading: every operation on any thread. Observers are told in an exclusive task: they may ask
// for views (`seenBy`) and nothing else of this, and wait for nobody who might.
// Ownership: observers that may outlive their object hold it weakly.
class InstalledBag final {
 public:
  using Observer = std::function<void(BagNews news, const BagPointer& bag)>;

  InstalledBag(WorkQueues& queues, NotificationCenter& notifications);

  BagPointer get() const;
  // That bag as a user agent sees it, made once for each agent while that bag is the latest; null
  // for null.
  BagPointer seenBy(const BagPointer& bag, const std::optional<std::string>& userAgent) const;
  // Tells the present before it returns. Never in an observer.
  Subscription observe(Observer observer) const;

  // Puts a bag in force, tells it, then runs `told` with the one before, all before the next news.
  // A bag from disk never replaces one: then nothing happens.
  void install(const BagPointer& bag, BagOrigin origin,
               FunctionRef<void(const BagPointer& before)> told);
  void tellFailure(const Error& error);

 private:
  // User agents come from clients: views of so many are remembered.
  static constexpr std::size_t kViewsKept = 64;

  // Fixed after construction.
  NotificationCenter& notifications_;
  const std::unique_ptr<ConcurrentQueue> queue_;

  // Own synchronisation.
  mutable Mutex viewsMutex_;
  mutable std::shared_ptr<const json::object> viewed_ ZK_GUARDED_BY(viewsMutex_);
  mutable std::map<std::optional<std::string>, BagPointer> views_ ZK_GUARDED_BY(viewsMutex_);

  // Queue state: replaced in exclusive tasks only.
  BagPointer bag_ ZK_ON(queue_);
};

}  // namespace zelkord
