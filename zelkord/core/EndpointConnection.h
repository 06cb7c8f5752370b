#pragma once

#include <memory>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/Budget.h"
#include "platform/api/Interprocess.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/core/IdleTimer.h"
#include "zelkord/core/ServedInterface.h"
#include "zelkord/query/ImageCall.h"

namespace zelkord {

class Assembly;
class ClientStateManager;

// One connection to the endpoint: decodes calls for the client state manager. Ends after 180 to 240
// seconds without a message or a call under way.
//
// Threading: on the connection's queue. Calls for images ask on a queue of their own, a few images
// each in turn, so that none waits for another one; what blocks that queue delays no call's
// deadline. The connection's end gives all of them up.
// Errors: wrong arguments are answered with a D-Bus error, a call for images beyond the client
// process's share with LimitsExceeded.
class EndpointConnection final : public ipc::CallHandler,
                                 public std::enable_shared_from_this<EndpointConnection> {
 public:
  // `imageCalls`: how many calls for images may be under way.
  EndpointConnection(Assembly& assembly, std::weak_ptr<ClientStateManager> manager,
                     std::shared_ptr<Budget> imageCalls);

  static const ServedInterface<EndpointConnection>& interface();

  void start(const std::shared_ptr<ipc::Connection>& connection);
  void invalidated();
  void handle(ipc::Call call) override;
  void messageArrived() override { timer_->rearm(); }

 private:
  void _request(const ipc::Call& call);
  void _loadImages(const ipc::Call& call);
  ImageCall::Completion _imageAnswer(const ipc::Call& call, Budget::Share share);
  void _beginImages(ImageOrder order, ImageCall::Completion completion);
  void _askForImages(const std::shared_ptr<ImageCall>& call);
  // False after the end.
  bool _remember(const std::shared_ptr<ImageCall>& call);

  Assembly& assembly_;
  const std::weak_ptr<ClientStateManager> manager_;
  const std::shared_ptr<Budget> imageCalls_;
  const std::unique_ptr<SerialQueue> imagesQueue_;
  std::shared_ptr<IdleTimer> timer_;
  std::string holder_;  // of budgets: the client process

  Mutex mutex_;
  bool ended_ ZK_GUARDED_BY(mutex_) = false;
  std::vector<std::weak_ptr<ImageCall>> calls_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
