#pragma once

#include <string>

#include "corezelkor/client/internal/BusPointers.h"

namespace zelkord::bench {

// Throws std::runtime_error with `what` when an sd-bus call has failed.
void check(int result, const std::string& what);

// Connections that are made at once or throw std::runtime_error; a peer authenticates later.
zelkor::BusPointer connectToPeer(const std::string& address);
zelkor::BusPointer connectToBus(const std::string& address);

}  // namespace zelkord::bench
