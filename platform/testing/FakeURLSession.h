#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/URLSession.h"
#include "platform/api/WorkQueues.h"
#include "platform/testing/FakeURLCache.h"
#include "platform/testing/FakeURLTask.h"

namespace zelkord {

// A session without a network: it records its tasks, the test answers them.
//
//   session.pending().at(0)->succeed(200, "[]");
//
// Threading: any thread; what `setOnResume` and `setProxyError` set counts for the tasks resumed
// afterwards and is set while nothing is. Completions run on a queue of the given work queues,
// never after the session's end.
class FakeURLSession final : public URLSession {
 public:
  FakeURLSession(WorkQueues& queues, URLSessionConfiguration configuration,
                 FakeFileManager* files = nullptr);

  const URLSessionConfiguration& configuration() const { return configuration_; }
  // All tasks in the order in which they were made; kept until `forgetTasks`.
  std::vector<std::shared_ptr<FakeURLTask>> tasks() const;
  // Those that wait for an answer.
  std::vector<std::shared_ptr<FakeURLTask>> pending() const;
  void forgetTasks();
  int purges() const;
  // In the order in which they ended.
  std::vector<std::string> endedIdentities() const;

  // Called in `resume`, on its thread: may answer at once.
  void setOnResume(std::function<void(FakeURLTask&)> handler);
  // What `enableProxy` fails with; none: it succeeds.
  void setProxyError(std::optional<Error> error);

  // URLSession
  std::shared_ptr<URLTask> dataTask(URLRequest request, URLCompletion completion) override;
  std::shared_ptr<URLTask> downloadTask(URLRequest request, URLCompletion completion) override;
  FakeURLCache* cache() override { return configuration_.cache ? &cache_ : nullptr; }
  void purgeMemoryCache() override;
  void endIdentity(const std::string& identity) override;

 private:
  std::shared_ptr<FakeURLTask> _makeTask(URLRequest request, URLCompletion completion);

  // Fixed after construction.
  const URLSessionConfiguration configuration_;
  const std::shared_ptr<FakeURLTask::Session> shared_;

  FakeURLCache cache_;
  mutable Mutex mutex_;
  std::vector<std::shared_ptr<FakeURLTask>> tasks_ ZK_GUARDED_BY(mutex_);
  int purges_ ZK_GUARDED_BY(mutex_) = 0;
  std::vector<std::string> endedIdentities_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
