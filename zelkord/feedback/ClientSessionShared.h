#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "base/UUID.h"
#include "platform/api/WorkQueue.h"
#include "zelkord/feedback/ClientSession.h"
#include "zelkord/feedback/SessionRecords.h"

namespace zelkord {

class Assembly;

// One session for all clients: a member session for each user agent, all with the same beginning
// and end.
//
// Threading: any thread. Ownership: the assembly outlives it. Errors: a record without user agent
// is dropped.
class ClientSessionShared final : public SessionRecords {
 public:
  // Opens the member of the record's user agent.
  ClientSessionShared(Assembly& assembly, ZelkorFeedback feedback,
                      SessionEndReason previousSessionEndReason);

  // Of the record that it began with.
  std::optional<UUID> userGuid() const override { return userGuid_; }
  void addFeedback(ZelkorFeedback feedback) override;
  // In the order of the user agents.
  void enumerateSessions(const Visitor& visitor) override;
  std::vector<ZelkorFeedback> getSessionFeedbacks() override;
  std::vector<std::string> feedbacksWithRelativeTimestamp() override;
  std::vector<std::string> privacyFilteredFeedbacksWithRelativeTimestamp() override;

 private:
  void _add(ZelkorFeedback feedback);
  // What `read` gives of each member, one after the other.
  template <typename Item>
  std::vector<Item> _ofAllMembers(std::vector<Item> (ClientSession::*read)());

  // Fixed after construction.
  Assembly& assembly_;
  const SessionEndReason previousSessionEndReason_;
  const std::optional<UUID> userGuid_;
  const std::unique_ptr<SerialQueue> sessionQueue_;

  // Queue state.
  std::map<std::string, std::shared_ptr<ClientSession>> sessionMap_ ZK_ON(sessionQueue_);
};

}  // namespace zelkord
