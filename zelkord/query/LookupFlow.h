#pragma once

#include "zelkord/query/BagGatedFlow.h"

namespace zelkord {

// A lookup of a text that the user has selected. It may be repeated as long as its answer can still
// be shown. Results that do not fit the text around the selection are dropped, once there is
// somebody who can tell.
class LookupFlow final : public BagGatedFlow {
 public:
  using BagGatedFlow::BagGatedFlow;

 private:
  std::string _input() const override { return request_->queryString; }
  std::shared_ptr<const HVFeedback> _makeStart(const URLRequest& request) const override;
  std::optional<SteadyTime> _deadline(const ZLKBag* bag) const override;
  void _filter(Body& body) const override;
  void _didSend() override { state_->_setPerformedSearch(); }
};

// The moment after which a lookup sent `now` is not repeated: half a second before the client gives
// up on rendering it, which for a short time-out is past already. None without a time-out.
std::optional<SteadyTime> lookupDeadline(SteadyTime now, std::optional<Duration> renderTimeout);

}  // namespace zelkord
