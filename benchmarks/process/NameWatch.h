#pragma once

#include <string>

#include "corezelkor/client/internal/BusPointers.h"

namespace zelkord::bench {

// Sees a name get its owner, from the moment of construction on.
class NameWatch {
 public:
  NameWatch(const std::string& busAddress, const std::string& name);
  NameWatch(const NameWatch&) = delete;
  NameWatch& operator=(const NameWatch&) = delete;

  // False after ten seconds without.
  bool waitForOwner();

 private:
  zelkor::BusPointer bus_;
  bool owned_ = false;
};

}  // namespace zelkord::bench
