#pragma once

#include <functional>
#include <memory>
#include <vector>

#include "platform/api/Interprocess.h"
#include "zelkord/core/ServedInterface.h"

namespace zelkord {

class Assembly;
class ClientConnection;

// What tools may ask of a running daemon: how it is, its counters, its settings.
// Threading: any thread.
class Diagnostics final : public ipc::CallHandler {
 public:
  using Connections = std::function<std::vector<std::shared_ptr<ClientConnection>>()>;

  Diagnostics(Assembly& assembly, Connections connections);

  static const ServedInterface<Diagnostics>& interface();
  void handle(ipc::Call call) override;

  // JSON: {"pid", "version", "transactions", "connections", "states", "bag", "interprocess"}.
  // Without a bag "bag" has only how fetching it goes.
  std::string status() const;

 private:
  void _status(const ipc::Call& call);
  void _metrics(const ipc::Call& call);
  void _readDefault(const ipc::Call& call);
  void _writeDefault(const ipc::Call& call);

  Assembly& assembly_;
  const Connections connections_;
};

}  // namespace zelkord
