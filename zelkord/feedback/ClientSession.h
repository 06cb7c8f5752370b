#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "base/Error.h"
#include "base/Guarded.h"
#include "base/Mutex.h"
#include "halvane/StoredFeedback.h"
#include "platform/api/WorkQueue.h"
#include "zelkord/feedback/FeedbacksToSend.h"
#include "zelkord/feedback/FirstUse.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/feedback/SessionRecords.h"
#include "zelkord/feedback/SessionStorage.h"
#include "zelkord/feedback/SessionTransitions.h"
#include "zelkord/feedback/StoredSession.h"

namespace zelkord {

class Assembly;

// What one user did with one client between two session ends: a header and records.
//
// Open: the header is written when the session begins, each record as it comes; both lie in the
// session's container, not in memory. Complete: the container is closed, for the upload to read.
// A session that was read back holds its records, and nothing is added to it.
//
// Threading: any thread. Records are serialised on the caller's; what the container has to wait
// for, nobody waits for. Ownership: the assembly outlives it. Errors: logged and counted.
class ClientSession final : public FeedbackSession,
                            public SessionRecords,
                            public std::enable_shared_from_this<ClientSession> {
 public:
  // Opens a session with its first record, if there is one.
  static std::shared_ptr<ClientSession> make(
      Assembly& assembly, std::optional<ZelkorFeedback> feedback,
      SessionEndReason previousSessionEndReason = SessionEndReason::None,
      SessionKind kind = SessionKind::Managed);
  // A session that was read back.
  static std::shared_ptr<ClientSession> make(Assembly& assembly, StoredSession stored);
  // A session of the daemon's own that begins with an error.
  static std::shared_ptr<ClientSession> createFeedbackSessionFromError(const Error& error,
                                                                       Assembly& assembly);

  std::optional<std::string> agent() const;
  void setAgent(std::optional<std::string> agent);
  std::optional<UUID> userGuid() const override;
  void setUserGuid(const std::optional<UUID>& guid);
  CZClientSession header() const;
  std::optional<WallTime> sessionStart() const;
  std::map<std::string, std::string> resourceVersions() const;
  std::optional<WallTime> firstUseDate() const { return firstUseDate_; }

  void addFeedback(ZelkorFeedback feedback) override;
  void sessionComplete() override;
  void enumerateSessions(const Visitor& visitor) override;
  std::vector<ZelkorFeedback> getSessionFeedbacks() override;
  std::vector<std::string> feedbacksWithRelativeTimestamp() override;
  std::vector<std::string> privacyFilteredFeedbacksWithRelativeTimestamp() override;

  // Records that JSON cannot express are left out and counted as not sent.
  FeedbacksToSend getFeedbacksToSend();

 private:
  struct Opening {
    CZClientSession header;
    std::optional<WallTime> firstUseDate;
  };
  static Opening _opening(Assembly& assembly, const std::optional<ZelkorFeedback>& feedback,
                          SessionEndReason previousSessionEndReason);

  ClientSession(Assembly& assembly, Opening opening);

  void _open(std::optional<ZelkorFeedback> feedback, SessionKind kind);
  void _addFeedback(ZelkorFeedback feedback);
  // Keeps the record in memory once it is on disk.
  std::function<void()> _keepForTests(const ZelkorFeedback& feedback);
  bool _isOfAnotherUser(const ZelkorFeedback& feedback) const;
  // The members of "fb", joined by commas; how many.
  std::size_t _appendFilteredRecords(std::string& text);
  template <typename Visit>
  void _visitFilteredRecords(const Visit& visit);
  template <typename Missing, typename Items, typename Visit>
  void _visitMissing(Items items, const Visit& visit) const;
  void _countNotSent() const;

  // Fixed after construction.
  Assembly& assembly_;
  const std::unique_ptr<SerialQueue> sessionQueue_;
  const std::optional<WallTime> firstUseDate_;

  // Own synchronisation.
  mutable Mutex headerMutex_;
  CZClientSession header_ ZK_GUARDED_BY(headerMutex_);
  std::optional<UUID> userGuid_ ZK_GUARDED_BY(headerMutex_);
  Guarded<std::shared_ptr<SessionContainer>> storageHandle_;

  // Queue state.
  std::vector<ZelkorFeedback> sessionFeedbacks_ ZK_ON(sessionQueue_);
};

}  // namespace zelkord
