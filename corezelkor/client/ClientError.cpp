#include "corezelkor/client/ClientError.h"

#include <utility>

namespace zelkor {

Error clientError(ClientErrorCode code, std::string reason) {
  Error error{std::string(kClientErrorDomain), static_cast<std::int64_t>(code), {}};
  if (!reason.empty()) error.userInfo.emplace("reason", std::move(reason));
  return error;
}

bool isClientError(const Error& error, ClientErrorCode code) {
  return error.domain == kClientErrorDomain && error.code == static_cast<std::int64_t>(code);
}

}  // namespace zelkor
