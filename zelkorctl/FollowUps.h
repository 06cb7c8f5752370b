#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "corezelkor/client/ClientTypes.h"

namespace zelkorctl {

using zelkor::ClientAnswer;

// What an answer to what was typed leads on to.

// The first address of further results; nothing when no set names one.
std::optional<std::string> moreResultsURL(const ClientAnswer& answer, std::string_view typed);

// The address of the card of the n-th result (from 1) of the sets that fit; nothing when there is
// none.
std::optional<std::string> cardURL(const ClientAnswer& answer, std::string_view typed,
                                   std::size_t result);

}  // namespace zelkorctl
