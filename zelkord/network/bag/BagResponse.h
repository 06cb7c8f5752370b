#pragma once

#include <cstdint>
#include <optional>

#include "base/Error.h"
#include "base/Json.h"
#include "platform/api/Log.h"
#include "platform/api/SettingsStore.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

inline constexpr std::string_view kMaximumBagSizeSetting = "ZLKMaximumBagSize";
inline constexpr std::uint64_t kDefaultMaximumBagSize = registeredBytes(kMaximumBagSizeSetting);

// The setting, in bytes.
std::uint64_t maximumBagSize(const SettingsStore& settings);

// What the answer to a bag fetch amounts to: a dictionary, or the error.
struct BagResponse {
  std::optional<json::object> dictionary;
  std::optional<Error> error;
};

// A transport error stands as it is, and a body over the limit counts as one; everything else that
// is no JSON object with status 200 has kZLKErrorDomain, code 2. Logs what it finds, the bag's
// private parts only if told to.
BagResponse readBagResponse(const URLResult& result, std::uint64_t maximumSize, const Logger& log,
                            bool showsPrivateData = false);

}  // namespace zelkord
