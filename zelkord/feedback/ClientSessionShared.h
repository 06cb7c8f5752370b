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
// and end. Each member is a container, and clients say what user agent they have: there are at most
// so many members, of one process at most a quarter of them, and what further ones record goes to
// the member with the daemon's own user agent.
//
// Threading: any thread. Ownership: the assembly outlives it. Errors: a record without user agent
// is dropped.
class ClientSessionShared final : public SessionRecords {
 public:
  static constexpr std::size_t kMaximumMembers = 64;  // with the daemon's own
  static constexpr std::size_t kMembersOfAProcess = kMaximumMembers / 4;

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
  // The record as that of the daemon's own member, when there may be none for its user agent.
  void _adopt(ZelkorFeedback& feedback);
  bool _mayOpenMember(const ZelkorFeedback& feedback, const std::string& own) const;
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
  std::map<std::int64_t, std::size_t> membersOfProcess_ ZK_ON(sessionQueue_);
};

}  // namespace zelkord
