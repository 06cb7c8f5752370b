#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>

#include "platform/api/Interprocess.h"

namespace zelkord::ipc {

// What `Statistics` shows, kept while it happens. Threading: any thread.
struct TransportCounts {
  std::atomic<std::size_t> connections = 0;
  std::atomic<std::uint64_t> calls = 0;
  std::atomic<std::uint64_t> refused = 0;
  std::atomic<std::size_t> queuedBytes = 0;

  Statistics snapshot() const { return {connections, calls, refused, queuedBytes, 0}; }
};

}  // namespace zelkord::ipc
