#pragma once

#include <string>

#include "benchmarks/process/floor/FloorDoor.h"
#include "benchmarks/process/floor/echo/FloorWorker.h"

namespace zelkord::bench {

// What answering costs at least when the work is not the loop's: an echo with a worker's reply. One
// loop around plain sd-bus hands every call to another thread and, woken by it, answers with
// "nothing" or with a body of a given size, in messages of the daemon's form and size, on a socket
// and, given a bus, under a name there.
//
// Threading: the thread that calls run. Lives as long as the program.
class FloorEcho {
 public:
  // `bus` may be null. Without a body size the answer is "nothing".
  FloorEcho(const std::string& socketPath, sd_bus* bus, std::size_t bodySize);
  FloorEcho(const FloorEcho&) = delete;
  FloorEcho& operator=(const FloorEcho&) = delete;

  [[noreturn]] void run();

 private:
  void _sendReplies();

  const int epoll_;
  const std::string body_;
  FloorWorker worker_;
  FloorDoor door_;
};

}  // namespace zelkord::bench
