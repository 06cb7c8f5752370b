#pragma once

#include <string>
#include <vector>

namespace zelkor {

// The D-Bus address of a Unix socket.
std::string addressOfSocket(const std::string& path);

// Where the daemon's socket may be when nobody says, likeliest first: in the runtime directory.
// None when there is no such directory of our own.
std::vector<std::string> defaultSocketPaths();

// Why what the socket leads to is not to be talked to, as another user's process listens there;
// empty when nothing is wrong.
std::string problemWithPeer(int descriptor);

}  // namespace zelkor
