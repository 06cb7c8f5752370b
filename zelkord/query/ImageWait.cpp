#include "zelkord/query/ImageWait.h"

namespace zelkord {

void ImageWait::enter() {
  const MutexLock lock(mutex_);
  if (givenUp_) return;
  ++underWay_;
  group_->enter();
}

void ImageWait::leave() {
  const MutexLock lock(mutex_);
  if (givenUp_) return;
  --underWay_;
  group_->leave();
}

void ImageWait::giveUp() {
  const MutexLock lock(mutex_);
  givenUp_ = true;
  for (; underWay_ > 0; --underWay_) group_->leave();
}

}  // namespace zelkord
