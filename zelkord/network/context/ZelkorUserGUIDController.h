#pragma once

#include <memory>

#include "base/Time.h"
#include "platform/api/WorkQueue.h"
#include "zelkord/feedback/UserGUIDSource.h"

namespace zelkord {

class Assembly;

// The identifier that requests and feedback carry in place of the person: random, held in memory
// only, replaced at its first use 900 s or more after it was made, or by `reset`. Each replacement
// counts "com.quenta.zelkord.userguid" and posts "ZLKUserGUIDChangeNotification"; the first
// identifier does neither. An identifier that is replaced, or whose controller goes, ends with the
// URL sessions and with maps: no connection, no cached answer and no session joins it to another.
//
// Threading: any thread but observers of that notification, which run on this controller's queue.
// Age is steady time: the wall clock may jump.
// Ownership: the assembly outlives this object.
class ZelkorUserGUIDController final : public UserGUIDSource {
 public:
  explicit ZelkorUserGUIDController(Assembly& assembly);
  ~ZelkorUserGUIDController() override;
  ZelkorUserGUIDController(const ZelkorUserGUIDController&) = delete;
  ZelkorUserGUIDController& operator=(const ZelkorUserGUIDController&) = delete;

  UUID currentUserGUID() override;
  void reset() override;

 private:
  void _rollGUID();

  // Fixed after construction.
  Assembly& assembly_;
  const std::unique_ptr<SerialQueue> queue_;

  // Queue state.
  UUID lastKnownUserGUID_ ZK_ON(queue_);
  SteadyTime lastKnownUserGUIDExpirationDate_ ZK_ON(queue_);
};

}  // namespace zelkord
