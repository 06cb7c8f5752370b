#pragma once

#include <memory>

#include "platform/api/Budget.h"
#include "platform/api/Log.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/ipc/ClientMemory.h"
#include "platform/linux/ipc/ConnectionBudgets.h"
#include "platform/linux/ipc/DescriptorReserve.h"
#include "platform/linux/ipc/SdBusOptions.h"
#include "platform/linux/ipc/TransportCounts.h"
#include "platform/linux/loop/Loop.h"

namespace zelkord::ipc {

// What all parts of the transport share; they end before it does.
struct IpcContext {
  Loop& loop;
  WorkQueues& queues;
  Logger log;
  LimitReports& limits;
  SdBusOptions options;
  // Tasks that clean up after connections; the transport lets them end before it does.
  std::shared_ptr<Group> cleaning;
  std::shared_ptr<ConnectionBudgets> connections;
  std::shared_ptr<ClientMemory> memory;
  std::shared_ptr<DescriptorReserve> reserve;
  std::shared_ptr<TransportCounts> counts = std::make_shared<TransportCounts>();
};

}  // namespace zelkord::ipc
