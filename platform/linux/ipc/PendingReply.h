#pragma once

#include <atomic>
#include <memory>

#include "platform/api/Interprocess.h"
#include "platform/api/Log.h"
#include "platform/linux/ipc/CallFlow.h"
#include "platform/linux/ipc/Outlet.h"
#include "platform/linux/loop/LoopInbox.h"

namespace zelkord::ipc {

// The way back to one caller, through the loop's inbox. The first answer counts.
//
// Threading: any thread. Ownership: outlives the connection and the transport without harm; answers
// then go nowhere.
class PendingReply final : public Reply {
 public:
  struct Route {
    std::shared_ptr<LoopInbox> inbox;
    std::weak_ptr<Outlet> outlet;
    Logger log;
  };

  PendingReply(Route route, CallOrigin origin, std::shared_ptr<const Method> method,
               CallFlow::Share share);
  // A call that wants no reply is answered, with nothing, once its handler let go of it.
  ~PendingReply() override;

  void send(Values values) override;
  void fail(std::string_view errorName, std::string_view text) override;

 private:
  // Whether an answer goes out: the first one, and somebody wants it.
  bool _take();

  const Route route_;
  const CallOrigin origin_;
  const std::shared_ptr<const Method> method_;
  const CallFlow::Share share_;
  std::atomic<bool> answered_ = false;
};

}  // namespace zelkord::ipc
