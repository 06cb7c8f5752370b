#include "zelkord/network/context/ZelkorUserGUIDController.h"

#include <utility>

#include "platform/api/RandomUUID.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/NotificationNames.h"

namespace zelkord {
namespace {

constexpr Duration kUserGUIDLifetime = 900s;

}  // namespace

ZelkorUserGUIDController::ZelkorUserGUIDController(Assembly& assembly)
    : assembly_(assembly),
      queue_(assembly.platform().queues.makeSerialQueue("com.quenta.zelkor.guid")),
      lastKnownUserGUID_(randomUUID(assembly.platform().random)),
      lastKnownUserGUIDExpirationDate_(assembly.platform().clock.now() + kUserGUIDLifetime) {}

ZelkorUserGUIDController::~ZelkorUserGUIDController() { assembly_.endIdentity(lastKnownUserGUID_); }

UUID ZelkorUserGUIDController::currentUserGUID() {
  UUID current;
  queue_->sync([this, &current] {
    queue_->assertCurrent();
    if (assembly_.platform().clock.now() >= lastKnownUserGUIDExpirationDate_) _rollGUID();
    current = lastKnownUserGUID_;
  });
  return current;
}

void ZelkorUserGUIDController::reset() {
  queue_->async([this] { _rollGUID(); });
}

void ZelkorUserGUIDController::_rollGUID() {
  queue_->assertCurrent();
  const auto ended = std::exchange(lastKnownUserGUID_, randomUUID(assembly_.platform().random));
  lastKnownUserGUIDExpirationDate_ = assembly_.platform().clock.now() + kUserGUIDLifetime;
  queue_->async([&assembly = assembly_, ended] {
    assembly.endIdentity(ended);
    assembly.reporter().addValue(1, "com.quenta.zelkord.userguid");
    assembly.notificationCenter().post(std::string(kZLKUserGUIDChangeNotification));
  });
}

}  // namespace zelkord
