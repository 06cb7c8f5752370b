#include "platform/linux/notifications/BusNotifications.h"

namespace zelkord {

void BusNotifications::post(std::string_view name) {
  const BusSignal signal{"/com/quenta/zelkord", "com.quenta.zelkord.Notification1", "Posted",
                         std::string(name)};
  if (sender_ && sender_(signal)) return;
  if (!complained_.test_and_set()) log_.notice("no session bus: notifications are not sent");
}

}  // namespace zelkord
