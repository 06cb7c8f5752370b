#pragma once

#include <cstdint>

namespace zelkord {

// Codes of the errors in kZLKErrorDomain that clients get.
inline constexpr std::int64_t kBagFault = 1;           // no bag, no user agent, no URL
inline constexpr std::int64_t kConnectionFault = 500;  // the configuration, the service's answer

}  // namespace zelkord
