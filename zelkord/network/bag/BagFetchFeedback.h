#pragma once

#include <memory>
#include <optional>
#include <string>

#include "platform/api/URLRequest.h"
#include "zelkord/feedback/SessionManager.h"

namespace zelkord {

class Assembly;

// The feedback session of one bag fetch: its start, its end, an error if there was one. While the
// services behind it have not been made yet, the records have no user identifier, or go nowhere.
//
// Threading: one call at a time, any thread.
class BagFetchFeedback final {
 public:
  // Opens the session with the start record.
  BagFetchFeedback(const Assembly& assembly, const URLRequest& request,
                   std::optional<std::string> userAgent);

  void recordEnd(const URLResult& result, const TimingData& timing);
  void recordError(const Error& error);
  void sessionComplete();

 private:
  ZelkorFeedback _record(std::shared_ptr<const HVFeedback> feedback) const;

  const std::optional<std::string> userAgent_;
  const std::string uuid_;
  std::optional<UUID> userGuid_;
  std::shared_ptr<FeedbackSession> session_;  // may be null
};

}  // namespace zelkord
