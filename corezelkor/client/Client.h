#pragma once

#include <concepts>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "base/Export.h"
#include "corezelkor/Messages.h"
#include "corezelkor/ZLKFuture.h"
#include "corezelkor/client/ClientOptions.h"
#include "corezelkor/client/ClientTypes.h"

namespace zelkor {

class ClientCore;

// A program's way to the daemon: one connection, one thread that works for it.
//
// Nothing is connected before the first call. A connection that ended (an idle one does, after some
// minutes) is made anew, and configured, by the next call; calls that were under way then end with
// ClientErrorCode::Disconnected and are not repeated.
//
// Threading: any thread. Futures are fulfilled, and call-backs run, on the client's own thread:
// what runs there must neither block nor wait for another future nor destroy the client.
// Ownership: destroying the client ends its calls as ClientErrorCode::Cancelled.
// Errors: in the results; see ClientErrorCode for the library's own.
class ZK_EXPORT Client {
 public:
  explicit Client(ClientOptions options);
  ~Client();
  Client(const Client&) = delete;
  Client& operator=(const Client&) = delete;

  // One query. The daemon takes searches in the order of their query ids: one that is not above the
  // last is answered with nothing.
  ZLKFuture<ClientAnswer> request(std::shared_ptr<const ZLKRequest> request);
  template <std::derived_from<ZLKRequest> Request>
  ZLKFuture<ClientAnswer> request(Request query) {
    return request(std::make_shared<const Request>(std::move(query)));
  }

  ZLKFuture<ClientResult<ClientBag>> bag();
  ZLKFuture<ClientResult<std::vector<ClientSessionEntry>>> listSessions();
  // Only daemons of a later version answer it; others know no such method.
  ZLKFuture<ClientResult<ResourceFile>> fileHandleForResource(std::string identifier);

  // What the user did with the results of a query: a feedback message by its class name and in its
  // serialised form, or a whole serialised payload. The result tells only whether it was accepted.
  ZLKFuture<ClientResult<Nothing>> reportEvent(std::string event, std::int64_t queryId,
                                               std::string feedbackClass, std::string feedback);
  ZLKFuture<ClientResult<Nothing>> reportEvent(std::string event, std::int64_t queryId,
                                               std::string payload);
  // The records of the current feedback session, each as JSON.
  ZLKFuture<ClientResult<std::vector<std::string>>> feedback(std::string name);

 private:
  friend class DiagnosticsClient;
  friend class EndpointClient;

  const std::unique_ptr<ClientCore> core_;
};

}  // namespace zelkor
