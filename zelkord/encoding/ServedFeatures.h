#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace zelkord {

// Names and numbers of served features' metadata. The misspellings are part of the wire vocabulary.

std::uint32_t featureTypeFromString(std::string_view text);      // "mediatype" in any case; else 3
std::string_view stringFromFeatureType(std::uint32_t type);      // else "unkonwn"
std::uint32_t clientTypeFromString(std::string_view text);       // else 2
std::string_view stringFromClientType(std::uint32_t type);       // else "unknown"
std::uint32_t funcTypeFromString(std::string_view text);         // else 2
std::string_view stringFromFunctionType(std::uint32_t type);     // else "unknown"
std::uint32_t resultPlacementFromString(std::string_view text);  // else 0
std::string_view stringFromResultPlacement(std::uint32_t placement);  // else "unkonw"

// "brelin" or "lanthe", whichever the lower-cased user agent contains first in this order; else
// "unknown".
std::string_view getClientFromUserAgent(const std::optional<std::string_view>& userAgent);

}  // namespace zelkord
