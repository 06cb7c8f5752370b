#include "benchmarks/process/BusConnecting.h"

#include <cstring>
#include <stdexcept>

namespace zelkord::bench {
namespace {

constexpr std::uint64_t kCallTimeout = 30'000'000;  // microseconds

zelkor::BusPointer connect(const std::string& address, bool isBus) {
  sd_bus* bus = nullptr;
  check(sd_bus_new(&bus), "making a connection");
  zelkor::BusPointer owned(bus);
  check(sd_bus_set_address(bus, address.c_str()), "setting an address");
  check(sd_bus_set_bus_client(bus, isBus), "setting the kind of connection");
  check(sd_bus_set_method_call_timeout(bus, kCallTimeout), "setting the time-out");
  check(sd_bus_start(bus), "connecting to " + address);
  return owned;
}

}  // namespace

void check(int result, const std::string& what) {
  if (result < 0) throw std::runtime_error(what + ": " + std::strerror(-result));
}

zelkor::BusPointer connectToPeer(const std::string& address) { return connect(address, false); }

zelkor::BusPointer connectToBus(const std::string& address) { return connect(address, true); }

}  // namespace zelkord::bench
