#pragma once

#include <memory>

#include "platform/api/Budget.h"
#include "platform/api/Interprocess.h"
#include "zelkord/core/ConnectionPlaces.h"

namespace zelkord {

class Assembly;
class ClientStateManager;

// Admits connections to the endpoint, ten at a time, and gives each its handler.
// Threading: on the listener's queue; places come and go on their own.
class EndpointListener final : public ipc::ListenerDelegate {
 public:
  EndpointListener(Assembly& assembly, std::weak_ptr<ClientStateManager> manager);

  void admit(const ipc::Peer& peer,
             std::function<void(std::optional<Subscription>)> decide) override;
  void connectionBegan(const std::shared_ptr<ipc::Connection>& connection) override;

 private:
  Assembly& assembly_;
  const std::weak_ptr<ClientStateManager> manager_;
  const std::shared_ptr<ConnectionPlaces> places_;
  const std::shared_ptr<Budget> imageCalls_;
};

}  // namespace zelkord
