#include "benchmarks/process/NameWatch.h"

#include <cstdint>

#include "benchmarks/process/BusConnecting.h"
#include "benchmarks/process/Waiting.h"

namespace zelkord::bench {

NameWatch::NameWatch(const std::string& busAddress, const std::string& name)
    : bus_(connectToBus(busAddress)) {
  const auto rule =
      "type='signal',member='NameOwnerChanged',arg0='" + name + "',sender='org.freedesktop.DBus'";
  check(sd_bus_add_match(
            bus_.get(), nullptr, rule.c_str(),
            [](sd_bus_message* signal, void* self, sd_bus_error*) {
              const char* texts[3] = {"", "", ""};
              sd_bus_message_read(signal, "sss", &texts[0], &texts[1], &texts[2]);
              if (*texts[2] != '\0') static_cast<NameWatch*>(self)->owned_ = true;
              return 0;
            },
            this),
        "watching a name");
}

bool NameWatch::waitForOwner() {
  const auto deadline = Clock::now() + std::chrono::seconds(10);
  while (!owned_ && Clock::now() < deadline) {
    const int result = sd_bus_process(bus_.get(), nullptr);
    check(result, "the bus");
    if (result == 0) sd_bus_wait(bus_.get(), std::uint64_t{100'000});
  }
  return owned_;
}

}  // namespace zelkord::bench
