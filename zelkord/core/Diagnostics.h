#pragma once

#include <functional>
#include <memory>
#include <vector>

#include "platform/api/Interprocess.h"

namespace zelkord {

class Assembly;
class ClientConnection;

// What tools may ask of a running daemon: how it is, its counters, its settings.
// Threading: any thread.
class Diagnostics final : public ipc::CallHandler {
 public:
  using Connections = std::function<std::vector<std::shared_ptr<ClientConnection>>()>;

  Diagnostics(Assembly& assembly, Connections connections);

  void handle(ipc::Call call) override;

  // JSON: {"pid", "version", "transactions", "connections", "states", "bag", "interprocess"}.
  // Without a bag "bag" has only how fetching it goes.
  std::string status() const;

 private:
  void _readDefault(const ipc::Call& call) const;
  void _writeDefault(const ipc::Call& call) const;

  Assembly& assembly_;
  const Connections connections_;
};

}  // namespace zelkord
