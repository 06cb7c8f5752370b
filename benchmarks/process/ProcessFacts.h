#pragma once

#include <sys/types.h>

#include <cstdint>
#include <map>
#include <string>

namespace zelkord::bench {

// What the kernel knows about a process. Everything is 0 or empty when there is no such process.

// Processor time of all its threads since the start, in microseconds.
double processorTimeOf(pid_t process);
std::int64_t threadsOf(pid_t process);
double residentMiBOf(pid_t process);

// How often each thread went to sleep by itself, by the scheduler's count; by thread id and name.
using Sleeps = std::map<std::string, std::int64_t>;
Sleeps sleepsOf(pid_t process);
// The threads that slept between the two. One that has ended meanwhile is not counted.
Sleeps sleepsBetween(const Sleeps& before, const Sleeps& after);
std::int64_t sumOf(const Sleeps& sleeps);

// What a process, or the caller's thread, has used since its start.
struct Usage {
  double processor = 0;  // microseconds
  Sleeps sleeps;
};
Usage usageOf(pid_t process);
Usage usageOfThisThread();

}  // namespace zelkord::bench
