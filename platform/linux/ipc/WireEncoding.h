#pragma once

#include <systemd/sd-bus.h>

#include <cstddef>
#include <string>
#include <string_view>

#include "platform/api/Interprocess.h"

namespace zelkord::ipc {

// Appends values of that signature. Zero, or a negative errno: values of other types (EINVAL),
// values that no message can hold. Texts are sent as `wireText` makes them.
int encodeValues(sd_bus_message* message, std::string_view signature, const Values& values);

// A text that every library takes: replacement characters stand for what is not UTF-8, for zero
// bytes and for noncharacters. A message with the first two would cost us the bus connection;
// libsystemd refuses the third, here as well as at the reader.
std::string wireText(std::string_view text);

// What the values take in a message, roughly.
std::size_t encodedSize(const Values& values);

}  // namespace zelkord::ipc
