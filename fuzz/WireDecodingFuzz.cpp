// Bytes as an authenticated client would send them, read by the library behind the private sockets
// and decoded by every signature that an interface uses.
#include <sys/socket.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <variant>

#include "platform/linux/ipc/MessageGate.h"
#include "platform/linux/ipc/SocketAdoption.h"
#include "platform/linux/ipc/WireDecoding.h"

namespace {

using namespace zelkord::ipc;
using zelkord::Descriptor;

constexpr const char* kSignatures[] = {
    "a{sv}", "sa{sv}",  "sa{sv}a{sv}", "sxsay", "sxay",  "s",      "t",  "ss",
    "sss",   "aa{sv}t", "a(ss)",       "a{ss}", "a{sx}", "a{say}", "ah", "as"};

// What was decoded has the types that were asked for.
void decodeAsAnything(sd_bus_message* message) {
  for (const char* signature : kSignatures) {
    sd_bus_message_rewind(message, 1);
    const auto outcome = decodeArguments(message, signature, {});
    const auto* decoded = std::get_if<Decoded>(&outcome);
    if (decoded && signatureOf(decoded->values) != signature) std::abort();
  }
}

int onMessage(sd_bus_message* message, void*, sd_bus_error*) {
  decodeAsAnything(message);
  return 1;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  MessageHeader header;
  if (size < header.size() || size > 65'536) return 0;
  std::memcpy(header.data(), data, header.size());
  MessageGate gate(4u << 20);
  if (!gate.begin(header)) return 0;

  int pair[2];
  if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, pair) != 0) return 0;
  Descriptor client(pair[0]);
  Descriptor ours(pair[1]);
  const auto bus = adoptSocket(ours, true);
  if (!bus) return 0;
  sd_bus_slot* slot = nullptr;
  sd_bus_add_filter(bus.get(), &slot, &onMessage, nullptr);
  const SlotPtr filter(slot);
  if (::send(client.get(), data, size, MSG_NOSIGNAL) < 0) return 0;
  client.reset();
  for (int round = 0; round < 1000 && sd_bus_process(bus.get(), nullptr) > 0; ++round) {
  }
  return 0;
}
