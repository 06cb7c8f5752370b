#include "zelkord/feedback/StoredSessions.h"

#include "zelkord/feedback/ClientSession.h"
#include "zelkord/feedback/ClientSessionManager.h"

namespace zelkord {

std::shared_ptr<SessionManager> StoredSessions::makeManager(
    std::string identifier, std::shared_ptr<UserGUIDSource> guidController) {
  return std::make_shared<ClientSessionManager>(assembly_, std::move(guidController),
                                                std::move(identifier), room_);
}

std::shared_ptr<FeedbackSession> StoredSessions::makeSession(ZelkorFeedback first) {
  if (!room_->take(first) || !room_->takeSession(first)) return nullptr;
  return ClientSession::make(assembly_, std::move(first), SessionEndReason::None,
                             SessionKind::OneOff);
}

}  // namespace zelkord
