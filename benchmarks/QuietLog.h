#pragma once

#include "platform/api/Log.h"

namespace zelkord {

// Logs nothing, like a log at its default level does for debug and info.
class QuietLog final : public LogSink {
 public:
  bool isEnabled(LogLevel level) const override { return level >= LogLevel::Error; }
  bool showsPrivateData() const override { return false; }
  void write(LogLevel, std::string_view, std::string_view) override {}
};

}  // namespace zelkord
