#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>

#include "base/Export.h"
#include "base/Namespace.h"

namespace zelkor {

// A failure as a value. `code` is meaningful within `domain`; `userInfo` has at most the key
// "reason".
struct ZK_EXPORT Error {
  std::string domain;
  std::int64_t code = 0;
  std::map<std::string, std::string> userInfo;

  std::optional<std::string> reason() const;
  // Compact JSON: {"domain":…,"code":…,"userInfo":{…}}.
  std::string description() const;

  friend bool operator==(const Error&, const Error&) = default;
};

// Error domains.
inline constexpr std::string_view kZLKErrorDomain = "ZLKErrorDomain";
inline constexpr std::string_view kPOSIXErrorDomain = "POSIXErrorDomain";
inline constexpr std::string_view kURLErrorDomain = "URLErrorDomain";

// Codes in kURLErrorDomain.
enum class URLErrorCode : std::int64_t {
  Other = -1,
  Cancelled = -999,
  TimedOut = -1001,
  UnsupportedURL = -1002,
  HostNotFound = -1003,
  CannotConnect = -1004,
  ConnectionLost = -1005,
  TooManyRedirects = -1007,
  Insecure = -1022,
  TooLarge = -1103,
  TLSFailure = -1200,
};

ZK_EXPORT Error zelkorError(std::int64_t code, std::string reason);
ZK_EXPORT Error posixError(int number);
ZK_EXPORT Error urlError(URLErrorCode code, std::string reason = {});

}  // namespace zelkor
