#pragma once

#include <cstddef>
#include <deque>
#include <functional>
#include <map>
#include <string>
#include <vector>

#include "base/Namespace.h"

namespace zelkord {

// The order in which downloads begin: few at a time from one host, more from one that answers many
// on one connection, and not too many in all; the others wait. Those of one host begin in the order
// in which they came, and the hosts take turns, so that a slow one holds up nobody else.
//
// Threading: none of its own. Ownership: holds what waits.
class DownloadLine final {
 public:
  using Begin = std::function<void()>;
  enum class Connections { OneEach, Shared };

  static constexpr std::size_t kMostUnderWay = 48;
  static constexpr std::size_t kMostOfOneHost = 16;
  static constexpr std::size_t kMostOnSharedConnection = 32;
  static constexpr std::size_t kMostWaiting = 10'000;

  // False, without taking it, when too many wait already.
  bool add(const std::string& host, Begin begin);
  // One that had begun has ended; `connections` is how the host answered it.
  void ended(const std::string& host, Connections connections);
  // Those that begin now; from here on they are under way.
  std::vector<Begin> takeDue();

 private:
  struct Host {
    std::size_t underWay = 0;
    std::size_t most = kMostOfOneHost;  // remembered as long as something waits or is under way
    std::deque<Begin> waiting;
  };

  Host* _nextHost();

  std::map<std::string, Host> hosts_;
  std::string lastHost_;  // whose turn it was
  std::size_t underWay_ = 0;
  std::size_t waiting_ = 0;
};

}  // namespace zelkord
