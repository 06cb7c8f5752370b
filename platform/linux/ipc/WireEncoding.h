#pragma once

#include <systemd/sd-bus.h>

#include <cstddef>
#include <string>
#include <string_view>

#include "platform/api/Interprocess.h"

namespace zelkord::ipc {

// Appends values of that signature. Zero, or a negative errno: values of other types (EINVAL),
// values that no message can hold. Text that is not UTF-8, or holds a zero byte, is made valid with
// replacement characters: a message with such a text would cost us the bus connection.
int encodeValues(sd_bus_message* message, std::string_view signature, const Values& values);

// What the values take in a message, roughly.
std::size_t encodedSize(const Values& values);

}  // namespace zelkord::ipc
