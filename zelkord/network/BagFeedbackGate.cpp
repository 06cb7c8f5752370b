#include "zelkord/network/BagFeedbackGate.h"

#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/ZelkorBagController.h"

namespace zelkord {

bool BagFeedbackGate::dropsFeedback(const std::optional<std::string>& userAgent) {
  const auto* controller = assembly_.bagController();
  const auto bag = controller ? controller->inMemoryBag() : nullptr;
  if (!bag) return false;
  const MutexLock lock(mutex_);
  if (bag_ != bag || answers_.size() >= kAnswersKept) {
    bag_ = bag;
    answers_.clear();
  }
  const auto [answer, isNew] = answers_.try_emplace(userAgent, false);
  if (isNew) answer->second = !ZLKBag(bag->rawBag(), userAgent).feedbackEnabled();
  return answer->second;
}

}  // namespace zelkord
