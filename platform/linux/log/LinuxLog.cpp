#include "platform/linux/log/LinuxLog.h"

#include "platform/linux/log/FileLog.h"
#include "platform/linux/log/JournalLog.h"

namespace zelkord {

LinuxLog::LinuxLog(std::unique_ptr<LogOutput> output, const Clock& clock, LogLevel level)
    : output_(std::move(output)), clock_(clock), level_(level) {}

std::unique_ptr<LogOutput> LinuxLog::makeOutput(const std::string& path,
                                                const std::string& fallbackPath) {
  if (path.empty() && JournalLog::isThere()) return std::make_unique<JournalLog>();
  return std::make_unique<FileLog>(path.empty() ? fallbackPath : path);
}

void LinuxLog::write(LogLevel level, std::string_view category, std::string_view text) {
  if (isEnabled(level)) output_->write(clock_.wallNow(), level, category, text);
}

}  // namespace zelkord
