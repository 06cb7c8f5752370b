#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/api/DeviceProperties.h"

namespace zelkord {

// "Zelkord/1.0 (TYPE; NAME BUILD) SEED"; a seed that has that form already is returned unchanged.
// None for an empty seed.
std::optional<std::string> createUserAgentString(std::string_view seed,
                                                 const DeviceProperties& device);

// The daemon's own: its name and version stand twice, before and after the parenthesis.
std::optional<std::string> zelkordUserAgent(const DeviceProperties& device);

}  // namespace zelkord
