#pragma once

#include <cstddef>
#include <vector>

#include "platform/linux/system/Descriptor.h"

namespace zelkord::ipc {

// A few descriptors kept back for the moment when the process has no others: with them the next
// client still gets in.
//
// Threading: the loop.
class DescriptorReserve final {
 public:
  explicit DescriptorReserve(std::size_t count);

  // Sets the reserve free for what needs descriptors now. False: there are fewer than needed.
  bool spend(std::size_t needed);
  // Takes back as many as there are.
  void refill();

 private:
  const std::size_t count_;
  std::vector<Descriptor> kept_;
};

}  // namespace zelkord::ipc
