#pragma once

#include <vector>

#include "halvane/StoredFeedback.h"
#include "zelkord/feedback/ZelkorFeedback.h"

namespace zelkord {

// A session as it was read back: its header and its records, in the order in which they were
// written. The records have the header's user agent and user identifier.
struct StoredSession {
  CZClientSession header;
  std::vector<ZelkorFeedback> feedbacks;
};

}  // namespace zelkord
