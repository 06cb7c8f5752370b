#include "tests/soak/hostile/Caller.h"

#include "corezelkor/client/internal/Wire.h"

namespace zelkord::soak {
namespace {

constexpr const char* kPath = "/com/quenta/zelkord";
constexpr const char* kDaemon = "com.quenta.zelkord.Daemon1";
constexpr std::uint64_t kPatience = 2'000'000;  // microseconds

zelkor::MessagePointer newCall(sd_bus* bus, std::string_view interface, const char* member) {
  sd_bus_message* call = nullptr;
  sd_bus_message_new_method_call(bus, &call, nullptr, kPath, std::string(interface).c_str(),
                                 member);
  return zelkor::MessagePointer(call);
}

}  // namespace

Caller::Caller(const std::string& address) {
  sd_bus* bus = nullptr;
  sd_bus_new(&bus);
  bus_.reset(bus);
  sd_bus_set_address(bus, address.c_str());
  sd_bus_set_method_call_timeout(bus, kPatience);
  if (sd_bus_start(bus) < 0) bus_.reset();
}

std::string Caller::configure(const std::string& identifier, const std::string& userAgent) {
  if (!isOpen()) return {};
  const auto call = newCall(bus_.get(), kDaemon, "Configure");
  zelkor::MessageWriter writer(call.get());
  zelkor::writeConfiguration(writer, {identifier, userAgent});
  sd_bus_message* reply = nullptr;
  if (sd_bus_call(bus_.get(), call.get(), 0, nullptr, &reply) < 0) return {};
  const zelkor::MessagePointer owned(reply);
  const char* address = "";
  sd_bus_message_read(reply, "s", &address);
  return address;
}

bool Caller::call(std::string_view interface, const char* member, const Encode& encode) {
  if (!isOpen()) return false;
  const auto message = newCall(bus_.get(), interface, member);
  zelkor::MessageWriter writer(message.get());
  encode(writer);
  return writer.status() == 0 && sd_bus_call_async(bus_.get(), nullptr, message.get(), _onAnswer,
                                                   answered_.get(), 60'000'000) >= 0;
}

bool Caller::request(const zelkor::ZLKRequest& request) {
  return call(kDaemon, "Request", [&](auto& writer) { zelkor::writeRequest(writer, request); });
}

bool Caller::report(std::string_view feedbackClass, std::string_view message) {
  return call(kDaemon, "ReportEvent", [&](auto& writer) {
    writer.text("soak");
    writer.int64(1);
    writer.text(feedbackClass);
    writer.bytes(message);
  });
}

void Caller::process(std::chrono::milliseconds time, std::uint64_t answers) {
  const auto end = std::chrono::steady_clock::now() + time;
  while (isOpen() && *answered_ < answers) {
    const int result = sd_bus_process(bus_.get(), nullptr);
    if (result < 0) return bus_.reset();
    if (result > 0) continue;
    const auto left = std::chrono::duration_cast<std::chrono::microseconds>(
        end - std::chrono::steady_clock::now());
    if (left.count() <= 0) return;
    sd_bus_wait(bus_.get(), static_cast<std::uint64_t>(left.count()));
  }
}

int Caller::_onAnswer(sd_bus_message*, void* answered, sd_bus_error*) {
  ++*static_cast<std::uint64_t*>(answered);
  return 1;
}

std::string addressOfSocket(const std::string& path) { return "unix:path=" + path; }

}  // namespace zelkord::soak
