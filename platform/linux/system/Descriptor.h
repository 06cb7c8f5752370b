#pragma once

#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

#include "base/Namespace.h"

namespace zelkord {

// A file descriptor that is closed with its owner; -1 is none.
class Descriptor final {
 public:
  Descriptor() = default;
  explicit Descriptor(int number) : number_(number) {}
  Descriptor(Descriptor&& other) noexcept : number_(other.release()) {}
  Descriptor& operator=(Descriptor&& other) noexcept {
    if (this == &other) return *this;
    reset();
    number_ = other.release();
    return *this;
  }
  ~Descriptor() { reset(); }

  explicit operator bool() const { return number_ >= 0; }
  int get() const { return number_; }
  // Gives it up, open.
  int release() { return std::exchange(number_, -1); }
  void reset() {
    if (number_ >= 0) ::close(release());
  }
  // The close's own result, which is where some file systems report a failed write.
  bool close() { return ::close(release()) == 0; }

 private:
  int number_ = -1;
};

// False, with errno set, when not all bytes could be written.
inline bool writeFully(int file, std::string_view bytes) {
  while (!bytes.empty()) {
    const auto count = ::write(file, bytes.data(), bytes.size());
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return false;
    bytes.remove_prefix(static_cast<std::size_t>(count));
  }
  return true;
}

// Appends all that is left of the file. False, with errno set, when that fails or is more than
// `limit` bytes.
inline bool readFully(int file, std::uint64_t limit, std::string& bytes) {
  constexpr std::size_t kStep = 64 * 1024;
  while (bytes.size() <= limit) {
    const auto old = bytes.size();
    bytes.resize(old + kStep);
    const auto count = ::read(file, bytes.data() + old, kStep);
    bytes.resize(old + (count > 0 ? static_cast<std::size_t>(count) : 0));
    if (count == 0) return true;
    if (count < 0 && errno != EINTR) return false;
  }
  errno = EFBIG;
  return false;
}

}  // namespace zelkord
