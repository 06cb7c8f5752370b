#pragma once

#include <optional>
#include <string>

#include "zelkord/feedback/FeedbackSeams.h"

namespace zelkord {

class Assembly;

// Keeps feedback out when the bag, as the client's user agent sees it, does not want it. Without a
// bag everything passes.
//
// Threading: any thread. Ownership: the assembly outlives it.
class BagFeedbackGate final : public FeedbackGate {
 public:
  explicit BagFeedbackGate(Assembly& assembly) : assembly_(assembly) {}

  bool dropsFeedback(const std::optional<std::string>& userAgent) override;

 private:
  Assembly& assembly_;
};

}  // namespace zelkord
