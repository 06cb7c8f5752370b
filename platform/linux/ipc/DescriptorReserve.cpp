#include "platform/linux/ipc/DescriptorReserve.h"

#include <sys/eventfd.h>

#include <utility>

namespace zelkord::ipc {

DescriptorReserve::DescriptorReserve(std::size_t count) : count_(count) { refill(); }

bool DescriptorReserve::spend(std::size_t needed) {
  if (kept_.size() < needed) return false;
  kept_.clear();
  return true;
}

void DescriptorReserve::refill() {
  while (kept_.size() < count_) {
    Descriptor kept(::eventfd(0, EFD_CLOEXEC));
    if (!kept) return;
    kept_.push_back(std::move(kept));
  }
}

}  // namespace zelkord::ipc
