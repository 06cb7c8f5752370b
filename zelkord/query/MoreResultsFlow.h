#pragma once

#include "zelkord/query/FollowUpFlow.h"

namespace zelkord {

// A further page of a section of results.
class MoreResultsFlow final : public FollowUpFlow {
 public:
  using FollowUpFlow::FollowUpFlow;

 private:
  // The query whose results these are: "q" of the request's own URL.
  std::string _input() const override;
  // Tools that watch are told that query.
  std::shared_ptr<const HVFeedback> _makeStart(const URLRequest& request) const override;
};

}  // namespace zelkord
