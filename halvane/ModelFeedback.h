#pragma once

// The feedback that clients send, and that the daemon makes of its own requests. Each record has
// the fields of its message, whose numbers and meanings corezelkor/proto/Feedback.proto fixes.

#include "halvane/CustomFeedback.h"
#include "halvane/EngagementFeedback.h"
#include "halvane/ErrorFeedback.h"
#include "halvane/ResultsFeedback.h"
#include "halvane/SearchFeedback.h"
#include "halvane/ViewFeedback.h"
