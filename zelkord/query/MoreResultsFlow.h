#pragma once

#include "zelkord/query/FollowUpFlow.h"

namespace zelkord {

// A further page of a section of results.
class MoreResultsFlow final : public FollowUpFlow {
 public:
  using FollowUpFlow::FollowUpFlow;

 private:
  // The query whose results these are: "q" of the request's own URL. Tools that watch are told.
  std::string _input() const override;
};

}  // namespace zelkord
