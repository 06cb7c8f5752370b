#include "zelkord/feedback/ClientSessionShared.h"

#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"

namespace zelkord {

ClientSessionShared::ClientSessionShared(Assembly& assembly, ZelkorFeedback feedback,
                                         SessionEndReason previousSessionEndReason)
    : assembly_(assembly),
      previousSessionEndReason_(previousSessionEndReason),
      userGuid_(feedback.userGuid),
      sessionQueue_(assembly.platform().queues.makeSerialQueue(
          "com.quenta.zelkord.clientSessionSharedQueue")) {
  sessionQueue_->sync([&] {
    sessionQueue_->assertCurrent();
    const auto agent = feedback.userAgent.value_or("");
    ++membersOfProcess_[feedback.pid];
    sessionMap_[agent] =
        ClientSession::make(assembly_, std::move(feedback), previousSessionEndReason_);
  });
}

// The queue is idle but for readers: the record is written on the caller's thread.
void ClientSessionShared::addFeedback(ZelkorFeedback feedback) {
  sessionQueue_->sync([&] { _add(std::move(feedback)); });
}

void ClientSessionShared::_add(ZelkorFeedback feedback) {
  sessionQueue_->assertCurrent();
  if (!feedback.userAgent) return;
  if (!sessionMap_.contains(*feedback.userAgent)) _adopt(feedback);
  auto& member = sessionMap_[*feedback.userAgent];
  if (!member) {
    ++membersOfProcess_[feedback.pid];
    member = ClientSession::make(assembly_, std::move(feedback), previousSessionEndReason_);
    return;
  }
  if (!member->agent()) member->setAgent(feedback.userAgent);
  if (!member->userGuid() && feedback.userGuid) member->setUserGuid(feedback.userGuid);
  member->addFeedback(std::move(feedback));
}

void ClientSessionShared::_adopt(ZelkorFeedback& feedback) {
  sessionQueue_->assertCurrent();
  auto own = zelkordUserAgent(assembly_.platform().device).value_or("");
  if (feedback.userAgent == own || _mayOpenMember(feedback, own)) return;
  assembly_.limits().refused("session_members", feedbackHolder(feedback));
  feedback.userAgent = std::move(own);
}

// The daemon's own member always has a place.
bool ClientSessionShared::_mayOpenMember(const ZelkorFeedback& feedback,
                                         const std::string& own) const {
  sessionQueue_->assertCurrent();
  if (sessionMap_.size() - sessionMap_.count(own) + 1 >= kMaximumMembers) return false;
  const auto found = membersOfProcess_.find(feedback.pid);
  return feedback.pid == 0 || found == membersOfProcess_.end() ||
         found->second < kMembersOfAProcess;
}

void ClientSessionShared::enumerateSessions(const Visitor& visitor) {
  sessionQueue_->sync([&] {
    sessionQueue_->assertCurrent();
    std::size_t left = sessionMap_.size();
    for (const auto& entry : sessionMap_) visitor(*entry.second, --left == 0);
  });
}

template <typename Item>
std::vector<Item> ClientSessionShared::_ofAllMembers(std::vector<Item> (ClientSession::*read)()) {
  std::vector<Item> all;
  enumerateSessions([&](ClientSession& member, bool) {
    auto items = (member.*read)();
    std::move(items.begin(), items.end(), std::back_inserter(all));
  });
  return all;
}

std::vector<ZelkorFeedback> ClientSessionShared::getSessionFeedbacks() {
  return _ofAllMembers(&ClientSession::getSessionFeedbacks);
}

std::vector<std::string> ClientSessionShared::feedbacksWithRelativeTimestamp() {
  return _ofAllMembers(&ClientSession::feedbacksWithRelativeTimestamp);
}

std::vector<std::string> ClientSessionShared::privacyFilteredFeedbacksWithRelativeTimestamp() {
  return _ofAllMembers(&ClientSession::privacyFilteredFeedbacksWithRelativeTimestamp);
}

}  // namespace zelkord
