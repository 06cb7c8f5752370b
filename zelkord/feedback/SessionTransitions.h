#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// When a feedback session begins and ends, as a table.

enum class SessionState : std::uint8_t {
  Active = 0,            // a session is open and within its soft limit
  SoftLimitReached = 1,  // it has run for 600 s: it ends at the next closing engagement, when it
                         // turns out to be idle, or 300 s later
  NoSession = 2,         // the next feedback opens one
};

// What happens to a session. Four is nobody's; other numbers are unknown too.
enum class SessionEvent : std::uint32_t {
  Feedback = 0,
  SoftLimitReached = 1,
  MaxTimerExpired = 2,
  ExternalFlush = 3,
  ScheduleFlushA = 5,
  CriticalMemory = 6,
  ScheduleFlushB = 7,
  IdleExpired = 8,
  GuidChanged = 9,
  Engagement = 10,
};

// Why a session ended: an index into vocabulary::kSessionEndReasons.
enum class SessionEndReason : std::int32_t {
  None = 0,
  ExternalRequest = 1,
  Idle = 2,
  MaxTime = 3,
  GuidChanged = 4,
  CriticalMemory = 5,
  Engagement = 6,
};

enum class SessionStep : std::uint8_t {
  AddFeedback,     // to the open session
  Flush,           // ends the session, for the transition's reason
  ResetGUID,       // replaces the user identifier
  TakeNewGUID,     // gives the feedback the current user identifier
  OpenSession,     // with the feedback
  InsertFlush,     // asks for an upload soon
  RefuseFeedback,  // only says so
  ReportUnknown,   // likewise
};

// What an event leads to: the steps in their order, then the state.
struct SessionTransition {
  static constexpr std::size_t kMostSteps = 4;

  constexpr SessionTransition(SessionState state, std::initializer_list<SessionStep> list,
                              SessionEndReason why = SessionEndReason::None)
      : next(state), reason(why), count(list.size()) {
    std::size_t index = 0;
    for (const auto step : list) steps[index++] = step;
  }

  const SessionStep* begin() const { return steps.data(); }
  const SessionStep* end() const { return steps.data() + count; }

  SessionState next;
  SessionEndReason reason;
  std::size_t count;
  std::array<SessionStep, kMostSteps> steps{};
};

SessionTransition transitionOf(SessionState state, SessionEvent event);

// A feedback type that ends a session whose soft limit is reached: engagements with a result or a
// card.
bool suggestsSessionEnd(std::uint32_t feedbackType);

}  // namespace zelkord
