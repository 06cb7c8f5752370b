#pragma once

#include <utility>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/KnowledgeStore.h"

namespace zelkord {

// Keeps what is donated.
// Threading: any thread.
class FakeKnowledgeStore final : public KnowledgeStore {
 public:
  void donate(DonatedInteraction interaction) override {
    const MutexLock lock(mutex_);
    donations_.push_back(std::move(interaction));
  }
  // Oldest first.
  std::vector<DonatedInteraction> donations() const {
    const MutexLock lock(mutex_);
    return donations_;
  }

 private:
  mutable Mutex mutex_;
  std::vector<DonatedInteraction> donations_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
