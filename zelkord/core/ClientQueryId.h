#pragma once

#include <cstdint>

#include "halvane/Feedback.h"

namespace zelkord {

// The client query identifier of the first result that the feedback speaks of, for the kinds that
// tell what became of a query. 0 for one without results, as that of a search that only starts, and
// for every other kind.
std::uint64_t clientQueryIdOf(const HVFeedback& feedback);

}  // namespace zelkord
