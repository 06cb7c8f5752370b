#pragma once

#include <cstdint>

#include "platform/api/Budget.h"

namespace zelkord {

// How much of the process's descriptors loading takes.
struct TransferLimits {
  Budget::Size transfers;         // under way
  Budget::Size patientTransfers;  // of low priority; the rest is left to the others
  Budget::Size waiting;           // for their turn
  long idleConnections = 0;       // of a session

  // For a process that may have so many descriptors. A transfer takes up to four: two connections
  // while a host's addresses are tried, and the look-up of its name.
  static TransferLimits of(std::uint64_t descriptors);
  static TransferLimits ofProcess();
};

}  // namespace zelkord
