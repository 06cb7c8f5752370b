#pragma once

#include "platform/api/Log.h"
#include "platform/api/SettingsStore.h"
#include "platform/api/TraceSink.h"

namespace zelkord {

// Codes of the kernel trace events: the start and the end of each client operation.
enum class TraceCode : std::uint32_t {
  SearchStart = 0x2B000004,
  SearchEnd = 0x2B000008,
  CardStart = 0x2B00000C,
  CardEnd = 0x2B000010,
  ZeroKeywordStart = 0x2B00001C,
  ZeroKeywordEnd = 0x2B000020,
  FeedbackStart = 0x2B000024,
  FeedbackEnd = 0x2B000028,
  LookupStart = 0x2B00002C,
  LookupEnd = 0x2B000030,
};

// Whether client operations leave trace events: the setting "TraceEnabled", read once.
// Threading: immutable, any thread.
class Tracing final {
 public:
  Tracing(const SettingsStore& settings, TraceSink& sink);

  bool isEnabled() const { return enabled_; }
  void emit(TraceCode code) const {
    if (enabled_) sink_.emit(static_cast<std::uint32_t>(code));
  }

 private:
  const bool enabled_;
  TraceSink& sink_;
};

// Reads the switch and logs what it says.
Tracing ZLKTracingSetup(const SettingsStore& settings, TraceSink& sink, const Logger& log);

}  // namespace zelkord
