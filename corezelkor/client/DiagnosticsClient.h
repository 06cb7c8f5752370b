#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "base/Export.h"
#include "corezelkor/client/Client.h"

namespace zelkor {

// A look inside the daemon, for tools. Needs no configuration.
//
// Threading, errors: as Client. Ownership: the client outlives it.
class ZK_EXPORT DiagnosticsClient {
 public:
  explicit DiagnosticsClient(Client& client) : core_(*client.core_) {}

  // JSON texts.
  ZLKFuture<ClientResult<std::string>> status() const;
  // Only daemons of a later version answer these two; others know no such method.
  ZLKFuture<ClientResult<std::string>> transfers() const;
  ZLKFuture<ClientResult<std::string>> resources() const;

  // Counters by key.
  ZLKFuture<ClientResult<std::map<std::string, std::int64_t>>> metrics() const;

  // Starts the download of a file that the bag lists. Likewise for daemons of a later version.
  ZLKFuture<ClientResult<Nothing>> fetchResource(std::string identifier) const;

  // A setting as JSON; an empty text when there is none. An empty domain is the daemon's own, an
  // empty key stands for the whole domain, as an object.
  ZLKFuture<ClientResult<std::string>> readDefault(std::string domain, std::string key) const;
  // An empty text deletes.
  ZLKFuture<ClientResult<Nothing>> writeDefault(std::string domain, std::string key,
                                                std::string json) const;

 private:
  ZLKFuture<ClientResult<std::string>> _text(std::string_view member,
                                             std::vector<std::string> arguments) const;
  ZLKFuture<ClientResult<Nothing>> _order(std::string_view member,
                                          std::vector<std::string> arguments) const;

  ClientCore& core_;
};

}  // namespace zelkor
