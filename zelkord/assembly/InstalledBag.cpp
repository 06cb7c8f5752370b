#include "zelkord/assembly/InstalledBag.h"

#include <utility>

#include "zelkord/assembly/NotificationNames.h"

namespace zelkord {

InstalledBag::InstalledBag(WorkQueues& queues, NotificationCenter& notifications)
    : notifications_(notifications),
      queue_(queues.makeConcurrentQueue("com.quenta.zelkord.bagcontroller.cacheaccess")) {}

BagPointer InstalledBag::get() const {
  BagPointer bag;
  queue_->sync([this, &bag] {
    queue_->assertReading();
    bag = bag_;
  });
  return bag;
}

BagPointer InstalledBag::seenBy(const BagPointer& bag,
                                const std::optional<std::string>& userAgent) const {
  if (!bag || bag->userAgent() == userAgent) return bag;
  const MutexLock lock(viewsMutex_);
  if (viewed_ != bag->rawBag()) views_.clear();
  viewed_ = bag->rawBag();
  const auto known = views_.find(userAgent);
  if (known != views_.end()) return known->second;
  if (views_.size() >= kViewsKept) views_.clear();
  return views_[userAgent] = std::make_shared<const ZLKBag>(bag->rawBag(), userAgent);
}

// No installation runs between the present and the registration.
Subscription InstalledBag::observe(Observer observer) const {
  Subscription subscription;
  queue_->barrierSync([&] {
    queue_->assertReading();
    observer(BagNews::Present, bag_);
    subscription = notifications_.observe(
        std::string(kZLKBagChangeNotification),
        [observer = std::move(observer)](const Notification& notification) {
          const auto* bag = notification.value<BagPointer>("bag");
          observer(bag ? BagNews::Change : BagNews::Failure, bag ? *bag : nullptr);
        });
  });
  return subscription;
}

void InstalledBag::install(const BagPointer& bag, BagOrigin origin,
                           FunctionRef<void(const BagPointer& before)> told) {
  queue_->barrierSync([&] {
    queue_->assertBarrier();
    if (origin == BagOrigin::Disk && bag_) return;
    const auto before = std::exchange(bag_, bag);
    notifications_.post({std::string(kZLKBagChangeNotification), nullptr, {{"bag", bag}}});
    told(before);
  });
}

void InstalledBag::tellFailure(const Error& error) {
  queue_->barrierSync([&] {
    notifications_.post({std::string(kZLKBagChangeNotification), nullptr, {{"bagError", error}}});
  });
}

}  // namespace zelkord
