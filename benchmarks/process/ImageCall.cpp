#include "benchmarks/process/ImageCall.h"

#include "benchmarks/process/BusConnecting.h"

namespace zelkord::bench {
namespace {

constexpr std::uint64_t kTimeout = 10'000;  // milliseconds

void appendDescriptors(sd_bus_message* call, const std::vector<std::string>& urls) {
  check(sd_bus_message_open_container(call, 'a', "a{sv}"), "writing");
  for (const auto& url : urls)
    check(sd_bus_message_append(call, "a{sv}", 1, "url", "s", url.c_str()), "writing");
  check(sd_bus_message_close_container(call), "writing");
}

std::size_t readSizes(sd_bus_message* reply) {
  std::size_t sum = 0;
  check(sd_bus_message_enter_container(reply, 'a', "{say}"), "reading images");
  while (sd_bus_message_enter_container(reply, 'e', "say") > 0) {
    const char* key = "";
    const void* bytes = nullptr;
    std::size_t size = 0;
    check(sd_bus_message_read(reply, "s", &key), "reading an image's name");
    check(sd_bus_message_read_array(reply, 'y', &bytes, &size), "reading an image");
    check(sd_bus_message_exit_container(reply), "reading an image");
    sum += size;
  }
  return sum;
}

}  // namespace

std::size_t loadImages(sd_bus* endpoint, const std::vector<std::string>& urls) {
  sd_bus_message* message = nullptr;
  check(sd_bus_message_new_method_call(endpoint, &message, nullptr, "/com/quenta/zelkord",
                                       "com.quenta.zelkord.Endpoint1", "LoadImages"),
        "making a call");
  const zelkor::MessagePointer call(message);
  appendDescriptors(message, urls);
  check(sd_bus_message_append(message, "t", kTimeout), "writing");
  sd_bus_message* answer = nullptr;
  check(sd_bus_call(endpoint, message, 0, nullptr, &answer), "loading images");
  return readSizes(zelkor::MessagePointer(answer).get());
}

}  // namespace zelkord::bench
