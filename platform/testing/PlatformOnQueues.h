#pragma once

#include "platform/api/Platform.h"

namespace zelkord {

// Files on the disk instead of the platform's; null: the platform's.
struct OtherFiles {
  FileManager* files = nullptr;
  ContainerFiles* containerFiles = nullptr;
};

// The platform with another clock and other queues, sessions that run on those, and, unless null,
// another log and other files: for stress tests and benchmarks of components on real threads. All
// stay the caller's.
inline Platform onQueues(const Platform& base, Clock& clock, WorkQueues& queues,
                         URLSessions& sessions, ProcessTransactions& transactions,
                         LogSink* log = nullptr, OtherFiles other = {}) {
  return {.clock = clock,
          .queues = queues,
          .log = log ? *log : base.log,
          .settings = base.settings,
          .files = other.files ? *other.files : base.files,
          .containerFiles = other.containerFiles ? *other.containerFiles : base.containerFiles,
          .notificationCenter = base.notificationCenter,
          .systemNotifications = base.systemNotifications,
          .transactions = transactions,
          .counters = base.counters,
          .trace = base.trace,
          .signals = base.signals,
          .process = base.process,
          .launchEvents = base.launchEvents,
          .propertyLists = base.propertyLists,
          .urlSessions = sessions,
          .interprocess = base.interprocess,
          .device = base.device,
          .locale = base.locale,
          .maps = base.maps,
          .accounts = base.accounts,
          .management = base.management,
          .location = base.location,
          .networkProxy = base.networkProxy,
          .tagger = base.tagger,
          .textInput = base.textInput,
          .random = base.random,
          .memoryPressure = base.memoryPressure,
          .knowledge = base.knowledge};
}

}  // namespace zelkord
