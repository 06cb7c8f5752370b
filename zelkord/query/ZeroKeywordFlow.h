#pragma once

#include "zelkord/query/BagGatedFlow.h"

namespace zelkord {

// Suggestions before anything is typed.
class ZeroKeywordFlow final : public BagGatedFlow {
 public:
  ZeroKeywordFlow(std::shared_ptr<ClientState> state,
                  std::shared_ptr<const ZLKZeroKeywordRequest> request, ReplyCallback reply);

 private:
  std::optional<URLRequest> _makeRequest(const ZLKBag* bag,
                                         const std::optional<UUID>& userGuid) override;
};

}  // namespace zelkord
