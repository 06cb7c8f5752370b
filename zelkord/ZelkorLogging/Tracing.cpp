#include "zelkord/ZelkorLogging/Tracing.h"

namespace zelkord {

Tracing::Tracing(const SettingsStore& settings, TraceSink& sink)
    : enabled_(boolSetting(settings, "TraceEnabled")), sink_(sink) {}

Tracing ZLKTracingSetup(const SettingsStore& settings, TraceSink& sink, const Logger& log) {
  Tracing tracing(settings, sink);
  log.info("ZLKTraceEnabled flag set to {}", tracing.isEnabled() ? 1 : 0);
  return tracing;
}

}  // namespace zelkord
