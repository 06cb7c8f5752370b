#include "zelkord/feedback/SessionTransitions.h"

#include <algorithm>

namespace zelkord {
namespace {

using enum SessionStep;
using State = SessionState;
using Reason = SessionEndReason;

constexpr std::array<std::uint32_t, 2> ZelkorEventsSuggestingSessionEnd = {8, 10};

SessionTransition onFeedback(State state) {
  switch (state) {
    case State::Active:
    case State::SoftLimitReached:
      return {state, {AddFeedback}};
    case State::NoSession:
      return {State::Active, {OpenSession}};
  }
  return {state, {RefuseFeedback}};
}

// The steps when the state is the one wanted; else nothing changes.
SessionTransition onlyIn(State wanted, State state, SessionTransition transition) {
  return state == wanted ? transition : SessionTransition{state, {}};
}

SessionTransition onGuidChanged(State state) {
  if (state != State::Active && state != State::SoftLimitReached) return {state, {}};
  return {State::Active, {Flush, OpenSession}, Reason::GuidChanged};
}

}  // namespace

SessionTransition transitionOf(SessionState state, SessionEvent event) {
  switch (event) {
    case SessionEvent::Feedback:
      return onFeedback(state);
    case SessionEvent::SoftLimitReached:
      return onlyIn(State::Active, state, {State::SoftLimitReached, {}});
    case SessionEvent::MaxTimerExpired:
      return onlyIn(State::SoftLimitReached, state, {State::NoSession, {Flush}, Reason::MaxTime});
    case SessionEvent::ExternalFlush:
      return {State::NoSession, {Flush}, Reason::ExternalRequest};
    case SessionEvent::ScheduleFlushA:
    case SessionEvent::ScheduleFlushB:
      return {state, {InsertFlush}};
    case SessionEvent::CriticalMemory:
      return {State::NoSession, {Flush, InsertFlush}, Reason::CriticalMemory};
    case SessionEvent::IdleExpired:
      return onlyIn(State::SoftLimitReached, state,
                    {State::Active, {Flush, ResetGUID, TakeNewGUID, OpenSession}, Reason::Idle});
    case SessionEvent::GuidChanged:
      return onGuidChanged(state);
    case SessionEvent::Engagement:
      return onlyIn(State::SoftLimitReached, state,
                    {State::NoSession, {AddFeedback, Flush, ResetGUID}, Reason::Engagement});
  }
  return {state, {ReportUnknown}};
}

bool suggestsSessionEnd(std::uint32_t feedbackType) {
  const auto& types = ZelkorEventsSuggestingSessionEnd;
  return std::find(types.begin(), types.end(), feedbackType) != types.end();
}

}  // namespace zelkord
