#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>

#include "base/Mutex.h"
#include "corezelkor/ZLKBag.h"
#include "zelkord/feedback/FeedbackSeams.h"

namespace zelkord {

class Assembly;

// Keeps feedback out when the bag, as the client's user agent sees it, does not want it. Without a
// bag everything passes.
//
// Threading: any thread; a read of the bag and of one map. Ownership: the assembly outlives it.
class BagFeedbackGate final : public FeedbackGate {
 public:
  explicit BagFeedbackGate(Assembly& assembly) : assembly_(assembly) {}

  bool dropsFeedback(const std::optional<std::string>& userAgent) override;

 private:
  // User agents come from clients: so many answers are remembered.
  static constexpr std::size_t kAnswersKept = 64;

  // Fixed after construction.
  Assembly& assembly_;

  // Own synchronisation.
  Mutex mutex_;
  std::shared_ptr<const ZLKBag> bag_ ZK_GUARDED_BY(mutex_);  // that the answers are of
  std::map<std::optional<std::string>, bool> answers_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
