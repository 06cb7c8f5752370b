#pragma once

#include <atomic>
#include <functional>
#include <string>

#include "platform/api/Log.h"
#include "platform/api/SystemNotifications.h"

namespace zelkord {

// A signal on the session bus with one text as its argument.
struct BusSignal {
  std::string path;
  std::string interface;
  std::string member;
  std::string argument;
};

// Notifications as signals com.quenta.zelkord.Notification1.Posted(name) of the daemon's object.
//
// Threading: any thread. Ownership: the log outlives it.
// Errors: without a bus nothing is sent; logged once.
class BusNotifications final : public SystemNotifications {
 public:
  // Queues the signal without waiting; false when there is no bus to send it on. Any thread.
  using Sender = std::function<bool(const BusSignal& signal)>;

  BusNotifications(Sender sender, LogSink& log) : sender_(std::move(sender)), log_(log, "") {}

  void post(std::string_view name) override;

 private:
  const Sender sender_;
  const Logger log_;
  std::atomic_flag complained_;
};

}  // namespace zelkord
