#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace zelkord {

// The first of "brelin", "lanthe", "vocari", "lookup", "messages", "news", "zelkord" that the
// lower-cased client identifier contains; none when it contains none of them.
std::optional<std::string> clientShortName(std::string_view identifier);

}  // namespace zelkord
