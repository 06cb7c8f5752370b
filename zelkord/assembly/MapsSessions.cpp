#include "zelkord/assembly/MapsSessions.h"

#include <algorithm>
#include <utility>

namespace zelkord {
namespace {

// Forgetting one costs no more than a session: its identifier gets a new one.
constexpr std::size_t kMostBindings = 256;

bool hasIdentifier(const MapsSessions::Session& session) { return session && *session; }

}  // namespace

MapsSessions::Session MapsSessions::ofRequest(const std::optional<UUID>& identifier) {
  const MutexLock lock(mutex_);
  auto session = maps_.userSession(false);
  if (!identifier || !hasIdentifier(session)) return session;
  _follow(**session);
  if (const auto* binding = _find(*identifier)) {
    return binding->session ? Session(binding->session) : std::nullopt;
  }
  if (owner_) session = maps_.userSession(true);
  if (!hasIdentifier(session)) return session;
  present_ = **session;
  owner_ = identifier;
  _bind(*identifier, present_);
  return session;
}

MapsSessions::Session MapsSessions::ofReply(const std::optional<UUID>& identifier) {
  const MutexLock lock(mutex_);
  auto session = maps_.userSession(false);
  if (!identifier || !hasIdentifier(session) || **session != present_) return session;
  const auto* binding = _find(*identifier);
  return binding && binding->session ? Session(binding->session) : session;
}

void MapsSessions::endIdentity(const UUID& identifier) {
  const MutexLock lock(mutex_);
  std::erase_if(bindings_, [&](const auto& binding) { return binding.identifier == identifier; });
  _bind(identifier, std::nullopt);
  ended_ = identifier;
}

void MapsSessions::identityChanged() {
  const MutexLock lock(mutex_);
  const auto ended = std::exchange(ended_, std::nullopt);
  if (ended && owner_ && *owner_ != *ended) return;
  maps_.userSession(true);
  owner_.reset();
}

const MapsSessions::Binding* MapsSessions::_find(const UUID& identifier) const {
  const auto found = std::find_if(bindings_.rbegin(), bindings_.rend(), [&](const auto& binding) {
    return binding.identifier == identifier;
  });
  return found == bindings_.rend() ? nullptr : &*found;
}

void MapsSessions::_bind(const UUID& identifier, std::optional<std::string> session) {
  if (bindings_.size() >= kMostBindings) bindings_.erase(bindings_.begin());
  bindings_.push_back({identifier, std::move(session)});
}

// What was replaced from outside belongs to nobody any more.
void MapsSessions::_follow(const std::string& present) {
  if (present == present_) return;
  present_ = present;
  owner_.reset();
  std::erase_if(bindings_, [](const auto& binding) { return binding.session.has_value(); });
}

}  // namespace zelkord
