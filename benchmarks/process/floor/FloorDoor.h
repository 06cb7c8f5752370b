#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <string>

#include "corezelkor/client/internal/BusPointers.h"

namespace zelkord::bench {

// The door of a floor: plain sd-bus connections at a socket and, given one, to a bus, whose calls
// all go to one handler.
//
// Threading: the thread that waits at `epoll`, where it registers its descriptors. Lives as long as
// the program.
class FloorDoor {
 public:
  using Handler = std::function<void(zelkor::MessagePointer call)>;

  FloorDoor(int epoll, const std::string& socketPath, Handler handler);
  FloorDoor(const FloorDoor&) = delete;
  FloorDoor& operator=(const FloorDoor&) = delete;

  void serve(sd_bus* bus);
  // To be called when the descriptor is ready; false when it is not one of the door's.
  bool ready(int descriptor);
  // Also from within the handler.
  void send(zelkor::MessagePointer reply);

 private:
  struct Served {
    sd_bus* bus = nullptr;
    std::uint32_t mask = 0;
  };

  void _listen(const std::string& socketPath);
  void _accept();
  int _handle(sd_bus_message* message);
  void _process(sd_bus* bus);
  void _updateMask(sd_bus* bus, int descriptor);

  const int epoll_;
  const Handler handler_;
  int listener_ = -1;
  std::map<int, Served> served_;  // by descriptor
};

// Waits for input there, too.
void watchInput(int epoll, int descriptor);

}  // namespace zelkord::bench
