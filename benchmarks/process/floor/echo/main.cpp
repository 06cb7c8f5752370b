// usage: zelkord_floor SOCKET NAME BYTES
//
// Serves on the socket and under the name on the session bus; answers have a body of so many bytes.

#include <cstdio>
#include <cstdlib>

#include "benchmarks/process/floor/echo/FloorEcho.h"

int main(int count, char** arguments) {
  if (count != 4) return 2;
  sd_bus* bus = nullptr;
  if (sd_bus_open_user(&bus) < 0 || sd_bus_request_name(bus, arguments[2], 0) < 0) {
    std::fputs("no name on the bus\n", stderr);
    return EXIT_FAILURE;
  }
  zelkord::bench::FloorEcho(arguments[1], bus, std::strtoul(arguments[3], nullptr, 10)).run();
}
