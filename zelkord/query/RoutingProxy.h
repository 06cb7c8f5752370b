#pragma once

#include "platform/api/URLSession.h"
#include "zelkord/assembly/Assembly.h"

namespace zelkord {

// Sends the task through the network proxy service when that is in use; one log line when that
// fails, and the task goes on without it.
inline void useRoutingProxy(const Assembly& assembly, URLTask& task) {
  if (!assembly.useMorvane() || !assembly.platform().networkProxy.isEnabled()) return;
  if (!task.enableProxy(nullptr)) {
    assembly.log(Category::Connection).error("Enabling Morvane for request failed.");
  }
}

}  // namespace zelkord
