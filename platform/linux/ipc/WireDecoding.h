#pragma once

#include <systemd/sd-bus.h>

#include <cstddef>
#include <string>
#include <string_view>
#include <variant>

#include "platform/api/Interprocess.h"

namespace zelkord::ipc {

struct DecodeFailure {
  enum class Kind {
    WrongType,  // the caller is told InvalidArgs
    OverLimit,  // the caller is told LimitsExceeded
    Malformed,  // not a D-Bus message: its connection ends
  };
  Kind kind;
  std::string text;
};

struct Decoded {
  Values values;
  std::size_t bytes = 0;  // what the values hold, roughly
};

// Dictionaries within dictionaries, and elements of all arrays of one call.
inline constexpr int kMaximumDecodingDepth = 16;
inline constexpr std::size_t kMaximumDecodedElements = 65'536;

// Reads the arguments of a message that is at its beginning. `signature` is made of types that
// `Value` has. Within a{sv}, a value of another type is skipped and becomes Unsupported; of a
// repeated key the last value wins.
std::variant<Decoded, DecodeFailure> decodeArguments(sd_bus_message* message,
                                                     std::string_view signature,
                                                     const Limits& limits);

// The first complete type of a valid signature that is not empty.
std::string_view firstCompleteType(std::string_view signature);

}  // namespace zelkord::ipc
