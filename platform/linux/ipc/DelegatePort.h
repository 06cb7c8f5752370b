#pragma once

#include <memory>
#include <optional>
#include <utility>

#include "platform/api/Interprocess.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/ipc/ServedConnection.h"

namespace zelkord::ipc {

// A listener's delegate and the queue on which it is asked.
// Threading: any thread. Ownership: its own tasks keep it.
class DelegatePort : public std::enable_shared_from_this<DelegatePort> {
 public:
  DelegatePort(IpcContext& context, std::shared_ptr<ListenerDelegate> delegate)
      : delegate_(std::move(delegate)),
        cleaning_(context.cleaning),
        queue_(context.queues.makeSerialQueue("com.quenta.zelkord.listener",
                                              QualityOfService::High)) {}

  void askAdmission(Peer peer, std::function<void(std::optional<Subscription>)> decide) {
    queue_->async([self = shared_from_this(), peer, decide = std::move(decide)] {
      self->delegate_->admit(peer, decide);
    });
  }
  // Tells the delegate, then lets the connection's calls through.
  void announce(std::shared_ptr<ServedConnection> connection) {
    queue_->async([self = shared_from_this(), connection = std::move(connection)] {
      self->delegate_->connectionBegan(connection);
      connection->open();
    });
  }
  // Gives a place back where the delegate's own code may run.
  void release(Subscription place) {
    cleaning_->enter();
    queue_->async(
        [self = shared_from_this(), held = std::make_shared<Subscription>(std::move(place))] {
          held->reset();
          self->cleaning_->leave();
        });
  }

 private:
  const std::shared_ptr<ListenerDelegate> delegate_;
  const std::shared_ptr<Group> cleaning_;
  const std::unique_ptr<SerialQueue> queue_;
};

}  // namespace zelkord::ipc
