#include "base/Error.h"

#include <cstring>

#include "base/Json.h"

namespace zelkor {

std::optional<std::string> Error::reason() const {
  const auto found = userInfo.find("reason");
  if (found == userInfo.end()) return std::nullopt;
  return found->second;
}

std::string Error::description() const {
  json::object info;
  for (const auto& [key, value] : userInfo) info[key] = value;
  return json::serialize(
      json::object{{"domain", domain}, {"code", code}, {"userInfo", std::move(info)}});
}

Error zelkorError(std::int64_t code, std::string reason) {
  return {std::string(kZLKErrorDomain), code, {{"reason", std::move(reason)}}};
}

Error posixError(int number) {
  return {std::string(kPOSIXErrorDomain), number, {{"reason", std::strerror(number)}}};
}

Error urlError(URLErrorCode code, std::string reason) {
  Error error{std::string(kURLErrorDomain), static_cast<std::int64_t>(code), {}};
  if (!reason.empty()) error.userInfo["reason"] = std::move(reason);
  return error;
}

}  // namespace zelkor
