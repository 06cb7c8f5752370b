#pragma once

#include <cstdint>

#include "base/Namespace.h"

namespace zelkord {

// What a request holds back.
using FieldMask = std::uint64_t;
inline constexpr FieldMask kFieldMaskNone = 0;
// The first bit: no location, no application signature, no routing. Other bits mean nothing to the
// requests themselves.
inline constexpr FieldMask kFieldMaskWithholdLocation = 1;

}  // namespace zelkord
