#pragma once

#include <cstddef>
#include <cstdint>
#include <random>

#include "base/Mutex.h"
#include "platform/api/RandomSource.h"

namespace zelkord {

// The same bytes in every run with the same seed. Threading: any thread; of several, who comes
// first has the earlier ones.
class SeededRandom final : public RandomSource {
 public:
  explicit SeededRandom(std::uint64_t seed = 1) : engine_(seed) {}

  void fill(void* bytes, std::size_t count) override {
    auto* const to = static_cast<unsigned char*>(bytes);
    const MutexLock lock(mutex_);
    for (std::size_t i = 0; i < count; ++i) to[i] = static_cast<unsigned char>(engine_());
  }

 private:
  Mutex mutex_;
  std::mt19937_64 engine_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
