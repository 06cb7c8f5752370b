#pragma once

#include <memory>
#include <string_view>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/URLSession.h"
#include "platform/api/WorkQueues.h"
#include "platform/testing/FakeURLSession.h"

namespace zelkord {

// Makes sessions without a network and keeps them for the test.
// Threading: any thread. Ownership: `queues` outlives it and its sessions.
class FakeURLSessions final : public URLSessions {
 public:
  // Downloads need a file manager to go to.
  explicit FakeURLSessions(WorkQueues& queues, FakeFileManager* files = nullptr)
      : queues_(queues), files_(files) {}

  // All sessions in the order in which they were made.
  std::vector<std::shared_ptr<FakeURLSession>> all() const;
  // The newest session of that name; null when none was made.
  std::shared_ptr<FakeURLSession> find(std::string_view name) const;

  // URLSessions
  std::shared_ptr<URLSession> make(const URLSessionConfiguration& configuration) override;

 private:
  WorkQueues& queues_;
  FakeFileManager* const files_;
  mutable Mutex mutex_;
  std::vector<std::shared_ptr<FakeURLSession>> sessions_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
