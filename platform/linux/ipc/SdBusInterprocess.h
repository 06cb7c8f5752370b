#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <variant>

#include "platform/api/Interprocess.h"
#include "platform/api/Log.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/ipc/IpcContext.h"
#include "platform/linux/ipc/SdBusOptions.h"

namespace zelkord::ipc {

// Interprocess connections as D-Bus: a name on the session bus, and private sockets that speak it
// without a bus. Both behave alike; the docs say what clients see.
//
// One loop has every sd-bus object and only frames, checks and dispatches; calls are handled on a
// queue of their connection, by who read them or by a worker, and answers come back through the
// loop's inbox: to its leader, many a wake-up, or, while it sleeps, sent by who handled the call.
// It sleeps while nobody calls.
//
// Threading: any thread, except the constructor, `listen` (once) and the destructor: one thread.
// Ownership: log, limits, queues and the options' watcher and crew outlive it; anonymous listeners
// may outlive it, closed. Errors: without a bus one error line, the socket alone is served until
// there is one; a name or a socket that is taken fails `listen`.
class SdBusInterprocess final : public Interprocess {
 public:
  SdBusInterprocess(WorkQueues& queues, LogSink& log, LimitReports& limits, SdBusOptions options);
  ~SdBusInterprocess() override;

  std::optional<Error> listen(const std::string& name, ListenerConfiguration configuration,
                              std::shared_ptr<ListenerDelegate> delegate) override;
  std::unique_ptr<AnonymousListener> makeAnonymousListener(
      ListenerConfiguration configuration, std::shared_ptr<ListenerDelegate> delegate) override;
  std::variant<std::string, Error> executableName(pid_t pid) const override;
  Statistics statistics() const override;

  // The signal "Posted" to everybody on the bus and on the private connections of `listen`. Never
  // waits.
  void postNotification(std::string_view name);

 private:
  struct Doors;

  Loop loop_;
  IpcContext context_;
  const std::shared_ptr<Doors> doors_;
};

}  // namespace zelkord::ipc
