#pragma once

#include <cstddef>
#include <cstdint>
#include <random>

#include "platform/api/Device.h"

namespace zelkord {

// The same bytes in every run with the same seed. Threading: one thread.
class SeededRandom final : public RandomSource {
 public:
  explicit SeededRandom(std::uint64_t seed = 1) : engine_(seed) {}

  void fill(void* bytes, std::size_t count) override {
    auto* const to = static_cast<unsigned char*>(bytes);
    for (std::size_t i = 0; i < count; ++i) to[i] = static_cast<unsigned char>(engine_());
  }

 private:
  std::mt19937_64 engine_;
};

}  // namespace zelkord
