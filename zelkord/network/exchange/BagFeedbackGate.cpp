#include "zelkord/network/exchange/BagFeedbackGate.h"

#include "zelkord/assembly/Assembly.h"

namespace zelkord {

bool BagFeedbackGate::dropsFeedback(const std::optional<std::string>& userAgent) {
  const auto& installed = assembly_.installedBag();
  const auto bag = installed.seenBy(installed.get(), userAgent);
  return bag && !bag->feedbackEnabled();
}

}  // namespace zelkord
