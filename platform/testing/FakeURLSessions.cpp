#include "platform/testing/FakeURLSessions.h"

#include <algorithm>

namespace zelkord {

std::vector<std::shared_ptr<FakeURLSession>> FakeURLSessions::all() const {
  const MutexLock lock(mutex_);
  return sessions_;
}

std::shared_ptr<FakeURLSession> FakeURLSessions::find(std::string_view name) const {
  const MutexLock lock(mutex_);
  const auto found = std::find_if(sessions_.rbegin(), sessions_.rend(), [&](const auto& session) {
    return session->configuration().name == name;
  });
  return found == sessions_.rend() ? nullptr : *found;
}

std::shared_ptr<URLSession> FakeURLSessions::make(const URLSessionConfiguration& configuration) {
  auto session = std::make_shared<FakeURLSession>(queues_, configuration, files_);
  const MutexLock lock(mutex_);
  sessions_.push_back(session);
  return session;
}

}  // namespace zelkord
