#pragma once

#include <functional>
#include <utility>

#include "platform/api/Budget.h"

namespace zelkord {

// The right of a transfer to be under way, from the beginning of its first request to the end of
// its last. Move-only; whoever waits for a place hears when one is given back.
//
// Threading: the loop.
class [[nodiscard]] TransferPlace {
 public:
  TransferPlace() = default;
  TransferPlace(Budget::Share place, Budget::Share patientPlace, std::function<void()> freed)
      : place_(std::move(place)),
        patientPlace_(std::move(patientPlace)),
        freed_(std::move(freed)) {}
  TransferPlace(TransferPlace&& other) noexcept { *this = std::move(other); }
  TransferPlace& operator=(TransferPlace&& other) noexcept {
    reset();
    place_ = std::move(other.place_);
    patientPlace_ = std::move(other.patientPlace_);
    freed_ = std::exchange(other.freed_, nullptr);
    return *this;
  }
  ~TransferPlace() { reset(); }

  void reset() {
    place_.reset();
    patientPlace_.reset();
    if (const auto freed = std::exchange(freed_, nullptr)) freed();
  }

 private:
  Budget::Share place_;
  Budget::Share patientPlace_;  // of those that leave room for others; may be empty
  std::function<void()> freed_;
};

}  // namespace zelkord
