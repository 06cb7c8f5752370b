#pragma once

namespace zelkord {

// Prepares the calling thread as one of the process's own: its name (at most 15 bytes) for tools,
// and no signals but those that a fault of its own raises, so that its system calls are not
// interrupted.
void beginServiceThread(const char* name);
// Whether the calling thread was prepared so.
bool isServiceThread();

}  // namespace zelkord
