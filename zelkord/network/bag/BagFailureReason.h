#pragma once

#include <string>
#include <string_view>

#include "base/Error.h"

namespace zelkord {

// Why a bag fetch failed, in words that its user understands, such as "connection refused". The
// error is one of `readBagResponse`'s.
std::string bagFailureReason(const Error& error);

// The URL without what is private of it: query, fragment and user information.
std::string urlForPeople(std::string_view url);

}  // namespace zelkord
