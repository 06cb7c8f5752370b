#pragma once

#include <memory>
#include <string>

#include "zelkord/feedback/FeedbackRoom.h"
#include "zelkord/feedback/SessionManager.h"

namespace zelkord {

class Assembly;

// Makes managers and sessions whose records go to the assembly's storage.
// Threading: any thread. Ownership: the assembly outlives what it made.
class StoredSessions final : public FeedbackSessions {
 public:
  explicit StoredSessions(Assembly& assembly)
      : assembly_(assembly), room_(std::make_shared<FeedbackRoom>(assembly)) {}

  std::shared_ptr<SessionManager> makeManager(
      std::string identifier, std::shared_ptr<UserGUIDSource> guidController) override;
  std::shared_ptr<FeedbackSession> makeSession(ZelkorFeedback first) override;

 private:
  Assembly& assembly_;
  const std::shared_ptr<FeedbackRoom> room_;
};

}  // namespace zelkord
