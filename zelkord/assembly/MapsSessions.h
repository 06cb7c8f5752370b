#pragma once

#include <optional>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "base/UUID.h"
#include "platform/api/MapsService.h"

namespace zelkord {

// Which session shared with maps goes with which user identifier: the service never sees one
// session under two identifiers, unless the device's profile fixes it.
//
// The present session belongs to the first identifier that is sent with it. An identifier that has
// none yet gets a new one, whether or not its change has been announced; the announcement then
// replaces nothing. Identifiers that live side by side keep their own, so they may alternate.
//
// Threading: any thread. Ownership: the service outlives it.
// Errors: what maps does not have belongs to nobody, and is told as it is.
class MapsSessions final {
 public:
  // As of MapsService::userSession.
  using Session = std::optional<std::optional<std::string>>;

  explicit MapsSessions(MapsService& maps) : maps_(maps) {}

  // What a request under the identifier carries; nothing when it has ended.
  Session ofRequest(const std::optional<UUID>& identifier);
  // What the reply to a request under the identifier tells; never replaces the session. The present
  // one when the identifier has none.
  Session ofReply(const std::optional<UUID>& identifier);
  // No request carries a session under it any more. Before the change is announced.
  void endIdentity(const UUID& identifier);
  // A change of identifier was announced.
  void identityChanged();

 private:
  struct Binding {
    UUID identifier;
    std::optional<std::string> session;  // none: the identifier has ended
  };

  const Binding* _find(const UUID& identifier) const ZK_REQUIRES(mutex_);
  void _bind(const UUID& identifier, std::optional<std::string> session) ZK_REQUIRES(mutex_);
  void _follow(const std::string& present) ZK_REQUIRES(mutex_);

  MapsService& maps_;
  Mutex mutex_;
  std::vector<Binding> bindings_ ZK_GUARDED_BY(mutex_);  // latest last
  std::string present_ ZK_GUARDED_BY(mutex_);            // as last seen
  std::optional<UUID> owner_ ZK_GUARDED_BY(mutex_);      // whose the present session is
  // Its change has not been announced yet.
  std::optional<UUID> ended_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
