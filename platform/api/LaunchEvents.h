#pragma once

#include <functional>
#include <string>

#include "base/Subscription.h"
#include "platform/api/WorkQueue.h"

namespace zelkord {

// Streams of events that start the daemon on demand: the names of what happened.
class LaunchEvents {
 public:
  virtual ~LaunchEvents() = default;
  virtual Subscription handle(const std::string& stream, WorkQueue& queue,
                              std::function<void(const std::string& name)> handler) = 0;
};

inline constexpr const char* kURLSessionLaunchStream = "com.quenta.urlsession.launch";
inline constexpr const char* kNotifyMatchingStream = "com.quenta.notifyd.matching";

}  // namespace zelkord
