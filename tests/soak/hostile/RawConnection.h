#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace zelkord::soak {

// A socket at the daemon's door whose bytes are one's own.
//
// Threading: one thread. Errors: a connection that is refused or cut off is one that is not open;
// nothing blocks for longer than two seconds.
class RawConnection {
 public:
  explicit RawConnection(const std::string& socketPath);
  ~RawConnection();
  RawConnection(RawConnection&& other) noexcept;
  RawConnection& operator=(RawConnection&&) = delete;

  bool isOpen() const { return socket_ >= 0; }
  // Says who we are, and that descriptors may be passed.
  bool authenticate();
  bool send(std::string_view bytes);
  // A byte with that many descriptors of /dev/null.
  bool sendDescriptors(int count);

 private:
  void _close();
  std::string _line();

  int socket_ = -1;
};

// The beginning of a D-Bus call without a body that is that long: "ay" of ReportEventData.
std::string headOfLongCall(std::uint32_t bodyBytes);

}  // namespace zelkord::soak
