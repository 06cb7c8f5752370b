#pragma once

#include <string>

namespace zelkord {

class Assembly;

// Sends the request that opens a connection to the service early. Its start and its end are
// recorded as the daemon's own, in the assembly's session manager; the answer is not used.
void sendWarmRequest(Assembly& assembly, const std::string& url);

}  // namespace zelkord
