#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace zelkorctl {

// What a service response to what was typed leads on to.

// The first address of further results; nothing when no set names one.
std::optional<std::string> moreResultsURL(std::string_view data, std::string_view typed);

// The address of the card of the n-th result (from 1) of the sets that fit; nothing when there is
// none.
std::optional<std::string> cardURL(std::string_view data, std::string_view typed,
                                   std::size_t result);

}  // namespace zelkorctl
