#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/api/Interprocess.h"
#include "platform/api/WorkQueues.h"

namespace zelkord {

class Assembly;
class ClientConnection;

// The named service: accepts every connection, gives each its `ClientConnection`, and keeps the
// list of those that live.
//
// Threading: any thread; the list belongs to `queue_`.
// Ownership: shared with the transport as the listener's delegate.
class ZelkorService final : public ipc::ListenerDelegate,
                            public std::enable_shared_from_this<ZelkorService> {
 public:
  // Makes what the assembly lacks of the feedback side: the identifier controller and the shared
  // session manager. `otherCalls` gets the calls of interfaces that are not about a client.
  ZelkorService(Assembly& assembly, std::shared_ptr<ipc::CallHandler> otherCalls);
  ~ZelkorService() override;

  void admit(const ipc::Peer& peer,
             std::function<void(std::optional<Subscription>)> decide) override;
  void connectionBegan(const std::shared_ptr<ipc::Connection>& connection) override;

  std::vector<std::shared_ptr<ClientConnection>> getClientConnections();

  // The name of the peer's program; nothing, after a log line, when it cannot be read.
  static std::optional<std::string> clientIDForConnection(const Assembly& assembly,
                                                          const ipc::Peer& peer);

 private:
  void _append(const std::shared_ptr<ClientConnection>& client);
  void _remove(const std::shared_ptr<ClientConnection>& client);
  void _invalidated(const std::shared_ptr<ClientConnection>& client, const std::string& name);
  void _end(const std::shared_ptr<ClientConnection>& client);
  Subscription _releaseAfter(Duration delay);

  // Fixed after construction.
  Assembly& assembly_;
  const std::shared_ptr<ipc::CallHandler> otherCalls_;
  const std::unique_ptr<SerialQueue> queue_;

  // Queue state.
  std::vector<std::shared_ptr<ClientConnection>> connections_ ZK_ON(queue_);
  Subscription release_ ZK_ON(queue_);  // of free memory, once after a while
};

}  // namespace zelkord
