#pragma once

#include <string>

namespace zelkor {

// The D-Bus address of a Unix socket.
std::string addressOfSocket(const std::string& path);

// Where the daemon's socket is when nobody says: in the runtime directory.
std::string defaultSocketPath();

}  // namespace zelkor
