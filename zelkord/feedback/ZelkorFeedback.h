#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "base/UUID.h"
#include "halvane/Feedback.h"

namespace zelkord {

// One feedback record on its way into a session: what happened, for which query, and who said so.
struct ZelkorFeedback {
  std::shared_ptr<const HVFeedback> feedback;
  std::int64_t queryId = 0;
  std::optional<UUID> userGuid;
  std::optional<std::string> userAgent;
  std::uint64_t clientQueryId = 0;
};

}  // namespace zelkord
