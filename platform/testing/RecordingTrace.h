#pragma once

#include <cstdint>
#include <utility>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/TraceSink.h"

namespace zelkord {

// Keeps the trace events. Threading: any thread.
class RecordingTrace final : public TraceSink {
 public:
  void emit(std::uint32_t code) override {
    const MutexLock lock(mutex_);
    codes_.push_back(code);
  }
  // Those since the last call.
  std::vector<std::uint32_t> take() {
    const MutexLock lock(mutex_);
    return std::exchange(codes_, {});
  }

 private:
  Mutex mutex_;
  std::vector<std::uint32_t> codes_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
