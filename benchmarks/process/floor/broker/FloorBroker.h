#pragma once

#include <string>
#include <vector>

#include "benchmarks/process/floor/FloorDoor.h"
#include "benchmarks/process/floor/broker/Fetches.h"

namespace zelkord::bench {

// What a network search costs at least: a minimal broker. One thread and one epoll loop, at which
// are a plain sd-bus door and a libcurl multi handle; a call's text and items are added to a URL,
// and what the service answers goes back in a message of the daemon's form. Nothing is cached,
// recorded, logged or looked into.
//
// Threading: the thread that calls run. Lives as long as the program.
class FloorBroker {
 public:
  // The URL has a query, to which that of each search is added.
  FloorBroker(const std::string& socketPath, std::string url,
              const std::vector<std::string>& headers);
  FloorBroker(const FloorBroker&) = delete;
  FloorBroker& operator=(const FloorBroker&) = delete;

  [[noreturn]] void run();

 private:
  void _handle(zelkor::MessagePointer call);

  const int epoll_;
  const std::string url_;
  Fetches fetches_;
  FloorDoor door_;
};

}  // namespace zelkord::bench
