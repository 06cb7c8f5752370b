#pragma once

#include <memory>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/Interprocess.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/core/IdleTimer.h"
#include "zelkord/query/ImageWait.h"
#include "zelkord/query/ImageWalk.h"

namespace zelkord {

class Assembly;
class ClientStateManager;

// One connection to the endpoint: decodes calls for the client state manager. Ends after 180 to 240
// seconds without a message or a call under way.
//
// Threading: on the connection's queue. Images, which may take until their deadline, are loaded on
// a queue of their own, one call at a time. The connection's end drops the calls that wait for
// their turn, and gives up the one that waits for its images.
class EndpointConnection final : public ipc::CallHandler,
                                 public std::enable_shared_from_this<EndpointConnection> {
 public:
  EndpointConnection(Assembly& assembly, std::weak_ptr<ClientStateManager> manager);

  void start(const std::weak_ptr<ipc::Connection>& connection);
  void invalidated();
  void handle(ipc::Call call) override;

 private:
  void _request(const ipc::Call& call);
  void _loadImages(const ipc::Call& call);
  void _answerImages(const std::vector<ImageDescriptor>& descriptors, SteadyTime deadline,
                     ipc::Reply& reply);
  // What the next call waits on; null after the end.
  std::shared_ptr<ImageWait> _nextWait();

  Assembly& assembly_;
  const std::weak_ptr<ClientStateManager> manager_;
  const std::unique_ptr<SerialQueue> imagesQueue_;
  std::shared_ptr<IdleTimer> timer_;

  Mutex mutex_;
  bool ended_ ZK_GUARDED_BY(mutex_) = false;
  std::shared_ptr<ImageWait> wait_ ZK_GUARDED_BY(mutex_);  // of the newest call
};

}  // namespace zelkord
