#include <gtest/gtest.h>
#include <stdlib.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <thread>
#include <vector>

#include "corezelkor/client/internal/BusConnection.h"
#include "corezelkor/client/internal/SocketAddress.h"

namespace zelkor {
namespace {

// A socket at which nobody is accepted and no more have a place.
class FullSocket {
 public:
  FullSocket() : folder_("/tmp/full-socket-XXXXXX"), listening_(::socket(AF_UNIX, SOCK_STREAM, 0)) {
    ::mkdtemp(folder_.data());
    sockaddr_un address{.sun_family = AF_UNIX, .sun_path = {}};
    path().copy(address.sun_path, sizeof(address.sun_path) - 1);
    const auto* raw = reinterpret_cast<const sockaddr*>(&address);
    ::bind(listening_, raw, sizeof(address));
    ::listen(listening_, 0);
    for (int result = 0; result == 0;) {
      waiting_.push_back(::socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK, 0));
      result = ::connect(waiting_.back(), raw, sizeof(address));
    }
  }
  ~FullSocket() {
    for (const int socket : waiting_) ::close(socket);
    ::close(listening_);
    ::unlink(path().c_str());
    ::rmdir(folder_.c_str());
  }

  std::string path() const { return folder_ + "/socket"; }
  void makeRoom() { waiting_.push_back(::accept(listening_, nullptr, nullptr)); }

 private:
  std::string folder_;
  const int listening_;
  std::vector<int> waiting_;
};

TEST(BusConnectionTest, WaitsForAPlaceButNotForEver) {
  FullSocket socket;
  std::string why;
  EXPECT_FALSE(BusConnection::toPeer(addressOfSocket(socket.path()), why));
  EXPECT_EQ(why, "Resource temporarily unavailable");

  std::thread later([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    socket.makeRoom();
  });
  EXPECT_TRUE(BusConnection::toPeer(addressOfSocket(socket.path()), why)) << why;
  later.join();
}

}  // namespace
}  // namespace zelkor
