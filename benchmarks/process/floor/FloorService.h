#pragma once

#include <systemd/sd-bus.h>

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>

#include "benchmarks/process/floor/FloorWorker.h"

namespace zelkord::bench {

// What answering costs at least: a service with one loop around plain sd-bus that answers every
// call from another thread with "nothing" or with a body of a given size, in messages of the
// daemon's form and size, on a socket and, given a bus, under a name there.
//
// Threading: the thread that calls run. Lives as long as the program.
class FloorService {
 public:
  // `bus` may be null. Without a body size the answer is "nothing".
  FloorService(const std::string& socketPath, sd_bus* bus, std::size_t bodySize);
  FloorService(const FloorService&) = delete;
  FloorService& operator=(const FloorService&) = delete;

  [[noreturn]] void run();

 private:
  void _listen(const std::string& socketPath);
  void _watch(int descriptor) const;
  void _serve(sd_bus* bus);
  void _accept();
  void _handleReadiness(int descriptor);
  int _handle(sd_bus_message* message);
  void _sendReplies();
  void _appendAnswer(sd_bus_message* reply) const;
  void _process(sd_bus* bus);
  void _updateMask(sd_bus* bus, int descriptor);

  struct Served {
    sd_bus* bus = nullptr;
    std::uint32_t mask = 0;
  };

  const int epoll_;
  const std::string body_;
  int listener_ = -1;
  FloorWorker worker_;
  std::map<int, Served> served_;  // by descriptor
};

}  // namespace zelkord::bench
