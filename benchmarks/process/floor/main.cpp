// usage: zelkord_floor SOCKET NAME
//
// Serves on the socket and under the name on the session bus.

#include <cstdio>
#include <cstdlib>

#include "benchmarks/process/floor/FloorService.h"

int main(int count, char** arguments) {
  if (count != 3) return 2;
  sd_bus* bus = nullptr;
  if (sd_bus_open_user(&bus) < 0 || sd_bus_request_name(bus, arguments[2], 0) < 0) {
    std::fputs("no name on the bus\n", stderr);
    return EXIT_FAILURE;
  }
  zelkord::bench::FloorService(arguments[1], bus).run();
}
