#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "zelkord/feedback/SessionTransitions.h"

namespace zelkord {
namespace {

using enum SessionStep;
using State = SessionState;
using Reason = SessionEndReason;

struct Row {
  std::uint32_t event;
  State in;
  std::vector<SessionStep> steps;
  State next;
  Reason reason = Reason::None;
};

// Every event in every state.
const std::vector<Row>& rows() {
  static const std::vector<Row> kRows = {
      {0, State::Active, {AddFeedback}, State::Active},
      {0, State::SoftLimitReached, {AddFeedback}, State::SoftLimitReached},
      {0, State::NoSession, {OpenSession}, State::Active},
      {1, State::Active, {}, State::SoftLimitReached},
      {1, State::SoftLimitReached, {}, State::SoftLimitReached},
      {1, State::NoSession, {}, State::NoSession},
      {2, State::Active, {}, State::Active},
      {2, State::SoftLimitReached, {Flush}, State::NoSession, Reason::MaxTime},
      {2, State::NoSession, {}, State::NoSession},
      {3, State::Active, {Flush}, State::NoSession, Reason::ExternalRequest},
      {3, State::SoftLimitReached, {Flush}, State::NoSession, Reason::ExternalRequest},
      {3, State::NoSession, {Flush}, State::NoSession, Reason::ExternalRequest},
      {4, State::Active, {ReportUnknown}, State::Active},
      {4, State::SoftLimitReached, {ReportUnknown}, State::SoftLimitReached},
      {4, State::NoSession, {ReportUnknown}, State::NoSession},
      {5, State::Active, {InsertFlush}, State::Active},
      {5, State::SoftLimitReached, {InsertFlush}, State::SoftLimitReached},
      {5, State::NoSession, {InsertFlush}, State::NoSession},
      {6, State::Active, {Flush, InsertFlush}, State::NoSession, Reason::CriticalMemory},
      {6, State::SoftLimitReached, {Flush, InsertFlush}, State::NoSession, Reason::CriticalMemory},
      {6, State::NoSession, {Flush, InsertFlush}, State::NoSession, Reason::CriticalMemory},
      {7, State::Active, {InsertFlush}, State::Active},
      {7, State::SoftLimitReached, {InsertFlush}, State::SoftLimitReached},
      {7, State::NoSession, {InsertFlush}, State::NoSession},
      {8, State::Active, {}, State::Active},
      {8,
       State::SoftLimitReached,
       {Flush, ResetGUID, TakeNewGUID, OpenSession},
       State::Active,
       Reason::Idle},
      {8, State::NoSession, {}, State::NoSession},
      {9, State::Active, {Flush, OpenSession}, State::Active, Reason::GuidChanged},
      {9, State::SoftLimitReached, {Flush, OpenSession}, State::Active, Reason::GuidChanged},
      {9, State::NoSession, {}, State::NoSession},
      {10, State::Active, {}, State::Active},
      {10,
       State::SoftLimitReached,
       {AddFeedback, Flush, ResetGUID},
       State::NoSession,
       Reason::Engagement},
      {10, State::NoSession, {}, State::NoSession},
      {11, State::Active, {ReportUnknown}, State::Active},
      {11, State::SoftLimitReached, {ReportUnknown}, State::SoftLimitReached},
      {11, State::NoSession, {ReportUnknown}, State::NoSession},
      {0, static_cast<State>(3), {RefuseFeedback}, static_cast<State>(3)},
  };
  return kRows;
}

TEST(SessionTransitionsTest, EveryEventInEveryState) {
  for (const auto& row : rows()) {
    SCOPED_TRACE(testing::Message()
                 << "event " << row.event << " in state " << static_cast<int>(row.in));
    const auto transition = transitionOf(row.in, static_cast<SessionEvent>(row.event));
    EXPECT_THAT(std::vector<SessionStep>(transition.begin(), transition.end()),
                testing::ElementsAreArray(row.steps));
    EXPECT_EQ(transition.next, row.next);
    EXPECT_EQ(transition.reason, row.reason);
  }
}

TEST(SessionTransitionsTest, OnlyEngagementsCloseASession) {
  for (std::uint32_t type = 0; type < 40; ++type) {
    EXPECT_EQ(suggestsSessionEnd(type), type == 8 || type == 10) << type;
  }
}

}  // namespace
}  // namespace zelkord
