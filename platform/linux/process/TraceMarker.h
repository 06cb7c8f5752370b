#pragma once

#include <mutex>
#include <string>

#include "platform/api/Log.h"
#include "platform/api/TraceSink.h"

namespace zelkord {

// Trace events as lines "zelkord: CODE" of the kernel's trace, opened with the first event. Where
// it cannot be written (no tracing file system, no permission) one log line says so and events
// vanish.
//
// Threading: any thread; a line is one write.
class TraceMarker final : public TraceSink {
 public:
  static constexpr const char* kPath = "/sys/kernel/tracing/trace_marker";

  explicit TraceMarker(Logger log, std::string path = kPath);
  ~TraceMarker() override;
  TraceMarker(const TraceMarker&) = delete;
  TraceMarker& operator=(const TraceMarker&) = delete;

  void emit(std::uint32_t code) override;

 private:
  void _open();

  const Logger log_;
  const std::string path_;
  std::once_flag opened_;
  int file_ = -1;  // set once
};

}  // namespace zelkord
