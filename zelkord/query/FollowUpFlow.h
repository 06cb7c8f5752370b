#pragma once

#include "zelkord/query/QueryFlow.h"

namespace zelkord {

// A query about results that the client has: more of them, or, as it is, the details of one. It
// waits for no bag and does without one, and takes nothing but a JSON list with status 200 for an
// answer.
class FollowUpFlow : public QueryFlow {
 public:
  using QueryFlow::QueryFlow;

 protected:
  std::optional<Refusal> _refusalOfAnswer(const URLResult& result) const override;
  std::optional<Refusal> _refusalOfBody(const Body& body) const override;
};

}  // namespace zelkord
