#pragma once

#include "base/Error.h"

namespace zelkord {

class Assembly;

// Records an error of the daemon's own in the assembly's session manager, with the daemon's user
// agent and the current user identifier. Nothing before there is a session manager.
void reportErrorAsZelkordFeedback(const Error& error, Assembly& assembly);

}  // namespace zelkord
