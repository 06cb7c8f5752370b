#pragma once

#include <optional>
#include <string>

#include "base/Json.h"

namespace zelkord {

// A JSON document as a header's value: compact, "/" unescaped, numbers in their shortest form, no
// control characters. None for what JSON text in UTF-8 cannot say: strings that are not UTF-8,
// numbers that are not finite.
std::optional<std::string> headerJson(const json::value& value);

}  // namespace zelkord
