#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/Interprocess.h"
#include "platform/api/WorkQueue.h"
#include "platform/linux/ipc/CallFlow.h"
#include "platform/linux/ipc/IpcContext.h"
#include "platform/linux/ipc/Outlet.h"
#include "platform/linux/ipc/PendingReply.h"

namespace zelkord::ipc {

// One client's connection, on whichever door.
//
// States: Beginning (calls wait until the delegate has set its handlers), Open, Ended. After its
// end calls that wait are dropped, the invalidation handler runs once, and both handlers are
// released, on the connection's queue. Threading: any thread. Ownership: its door until the end;
// tasks on its queue while they wait.
class ServedConnection final : public Connection,
                               public std::enable_shared_from_this<ServedConnection> {
 public:
  ServedConnection(IpcContext& context, Peer peer, std::weak_ptr<Outlet> outlet);

  // Connection
  Peer peer() const override { return peer_; }
  void setHandler(std::shared_ptr<CallHandler> handler) override;
  void setInvalidationHandler(std::function<void()> handler) override;
  void invalidate() override;
  void callClient(std::string_view path, std::string_view interface, std::string_view member,
                  std::string_view signature, Values values,
                  std::function<void(const Error&)> failure) override;

  // What its door does with it.
  const std::shared_ptr<CallFlow>& flow() { return flow_; }
  PendingReply::Route route() const { return {inbox_, outlet_, log_}; }
  void deliver(Call call);
  // A message that is not delivered.
  void messageArrived();
  void open();
  void end();

 private:
  enum class State { Beginning, Open, Ended };

  void _handle(Call call);
  void _queueInvalidation();
  void _runInvalidationHandler();
  void _fail(std::function<void(const Error&)> failure, int number);

  // Fixed after construction.
  const Peer peer_;
  const std::weak_ptr<Outlet> outlet_;
  const std::shared_ptr<LoopInbox> inbox_;
  const Logger log_;
  const std::shared_ptr<CallFlow> flow_;
  const std::shared_ptr<Group> cleaning_;
  const std::unique_ptr<SerialQueue> queue_;

  Mutex mutex_;
  State state_ ZK_GUARDED_BY(mutex_) = State::Beginning;
  std::vector<Call> waiting_ ZK_GUARDED_BY(mutex_);
  std::shared_ptr<CallHandler> handler_ ZK_GUARDED_BY(mutex_);
  std::function<void()> invalidationHandler_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord::ipc
