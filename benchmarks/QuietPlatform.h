#pragma once

#include "platform/api/Platform.h"

namespace zelkord {

// Logs nothing, like a log at its default level does for debug and info.
class QuietLog final : public LogSink {
 public:
  bool isEnabled(LogLevel level) const override { return level >= LogLevel::Error; }
  bool showsPrivateData() const override { return false; }
  void write(LogLevel, std::string_view, std::string_view) override {}
};

// The platform with another log, which stays the caller's.
inline Platform withLog(const Platform& base, LogSink& log) {
  return {.clock = base.clock,
          .queues = base.queues,
          .log = log,
          .settings = base.settings,
          .files = base.files,
          .notificationCenter = base.notificationCenter,
          .systemNotifications = base.systemNotifications,
          .transactions = base.transactions,
          .counters = base.counters,
          .trace = base.trace,
          .signals = base.signals,
          .process = base.process,
          .launchEvents = base.launchEvents,
          .propertyLists = base.propertyLists,
          .urlSessions = base.urlSessions,
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
          .memoryPressure = base.memoryPressure};
}

}  // namespace zelkord
