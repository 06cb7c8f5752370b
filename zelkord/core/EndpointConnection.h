#pragma once

#include <memory>

#include "platform/api/Interprocess.h"
#include "zelkord/core/IdleTimer.h"

namespace zelkord {

class Assembly;
class ClientStateManager;

// One connection to the endpoint: decodes calls for the client state manager. Ends after 180 to 240
// seconds without a message or a call under way. Threading: on the connection's queue.
class EndpointConnection final : public ipc::CallHandler {
 public:
  EndpointConnection(Assembly& assembly, std::weak_ptr<ClientStateManager> manager);

  void start(const std::weak_ptr<ipc::Connection>& connection);
  void invalidated();
  void handle(ipc::Call call) override;

 private:
  void _request(const ipc::Call& call);

  Assembly& assembly_;
  const std::weak_ptr<ClientStateManager> manager_;
  std::shared_ptr<IdleTimer> timer_;
};

}  // namespace zelkord
