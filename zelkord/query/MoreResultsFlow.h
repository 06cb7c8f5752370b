#pragma once

#include "zelkord/query/FollowUpFlow.h"

namespace zelkord {

// A further page of a section of results.
class MoreResultsFlow final : public FollowUpFlow {
 public:
  MoreResultsFlow(std::shared_ptr<ClientState> state,
                  std::shared_ptr<const ZLKMoreResultsRequest> request, ReplyCallback reply);

 private:
  std::optional<URLRequest> _makeRequest(const ZLKBag* bag,
                                         const std::optional<UUID>& userGuid) override;
  // The query whose results these are: "q" of the request's own URL.
  std::string _input() const override;

  const std::shared_ptr<const ZLKMoreResultsRequest> more_;
};

}  // namespace zelkord
