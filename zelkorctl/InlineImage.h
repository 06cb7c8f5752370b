#pragma once

#include <string>
#include <string_view>

namespace zelkorctl {

// Whether a terminal of this type (TERM) and program (TERM_PROGRAM) shows images sent by the kitty
// graphics protocol.
bool showsInlineImages(std::string_view type, std::string_view program);

// What makes such a terminal show a PNG where the cursor is. The bytes travel as base64, so nothing
// in them can steer the terminal.
std::string inlineImage(std::string_view png);

}  // namespace zelkorctl
