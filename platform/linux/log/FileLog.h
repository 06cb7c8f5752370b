#pragma once

#include <memory>
#include <optional>
#include <string>

#include "base/Error.h"
#include "platform/linux/log/LogOutput.h"

namespace spdlog::sinks {
class sink;
}

namespace zelkord {

// Log entries as lines of a file of mode 0600. At 8 MiB the file is renamed (zelkord.log to
// zelkord.1.log) and a new one begins; four old ones are kept. Each entry reaches the kernel before
// `write` returns.
//
// Threading: any thread.
// Errors: when the file cannot be opened or written, or is no regular file but a link, a pipe, a
// device, standard error says so once. Opening waits for nobody.
class FileLog final : public LogOutput {
 public:
  // Why that path can never be a log file; none when it can, or is empty. Makes nothing.
  static std::optional<Error> refusal(const std::string& path);

  explicit FileLog(const std::string& path);
  ~FileLog() override;

  void write(WallTime time, LogLevel level, std::string_view category,
             std::string_view text) override;
  void flush() override;

 private:
  void _complain(const char* problem);

  struct Complaint;
  const std::unique_ptr<Complaint> complaint_;
  std::shared_ptr<spdlog::sinks::sink> sink_;  // null when the file could not be opened
};

}  // namespace zelkord
