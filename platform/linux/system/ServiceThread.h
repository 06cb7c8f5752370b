#pragma once

#include <functional>
#include <thread>

#include "base/Namespace.h"

namespace zelkord {

// What a thread is there for. One that has a loop is lent no other: its own would wait meanwhile.
enum class ThreadWork { Tasks, Loop };

// A thread of the process's own: with a name for tools (at most 15 bytes), and no signals but those
// that a fault of its own raises, so that its system calls are not interrupted. Throws
// std::system_error when there is none to be had.
std::thread startServiceThread(const char* name, ThreadWork work, std::function<void()> body);
// Whether the calling thread was started so, for tasks.
bool mayBeLentLoops();
// Changes what the calling thread, started so, is there for; returns what it was.
ThreadWork setThreadWork(ThreadWork work);

}  // namespace zelkord
