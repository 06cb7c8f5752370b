#pragma once

#include "zelkord/query/FollowUpFlow.h"

namespace zelkord {

// The details of one result.
class CardFlow final : public FollowUpFlow {
 public:
  CardFlow(std::shared_ptr<ClientState> state, std::shared_ptr<const ZLKCardRequest> request,
           ReplyCallback reply);

 private:
  std::optional<URLRequest> _makeRequest(const ZLKBag* bag,
                                         const std::optional<UUID>& userGuid) override;

  const std::shared_ptr<const ZLKCardRequest> card_;
};

}  // namespace zelkord
