#pragma once

#include <sys/types.h>

#include <cstdint>
#include <map>
#include <string>

namespace zelkord::bench {

// What the kernel knows about a process. Everything is 0 or empty when there is no such process.

// Processor time of all its threads since the start, in microseconds.
double processorTimeOf(pid_t process);
double processorTimeOfThisThread();
std::int64_t threadsOf(pid_t process);
double residentMiBOf(pid_t process);
// How often each thread went to sleep by itself, by thread id and name.
std::map<std::string, std::int64_t> voluntarySwitchesOf(pid_t process);

}  // namespace zelkord::bench
