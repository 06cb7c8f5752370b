#include "platform/linux/log/LinuxLog.h"

#include "platform/linux/log/FileLog.h"
#include "platform/linux/log/JournalLog.h"
#include "platform/linux/log/LogLine.h"

namespace zelkord {

LinuxLog::LinuxLog(std::unique_ptr<LogOutput> output, const Clock& clock, LogLevel level)
    : output_(std::move(output)), clock_(clock), level_(level) {}

std::unique_ptr<LogOutput> LinuxLog::makeOutput(const std::string& path,
                                                const std::string& fallbackPath) {
  if (path.empty() && JournalLog::isThere()) return std::make_unique<JournalLog>();
  return std::make_unique<FileLog>(path.empty() ? fallbackPath : path);
}

void LinuxLog::writeFrom(const void* place, LogLevel level, std::string_view category,
                         std::string_view text) {
  if (!isEnabled(level)) return;
  std::vector<LogFolding::Summary> due;
  bool isAdmitted = false;
  {
    const MutexLock lock(mutex_);
    isAdmitted = folding_.admit(clock_.now(), {place, level, std::string(category)}, text, due);
  }
  for (const auto& summary : due) _output(summary.level, summary.category, summary.text);
  if (isAdmitted) _output(level, category, text);
}

void LinuxLog::_output(LogLevel level, std::string_view category, std::string_view text) {
  output_->write(clock_.wallNow(), level, category, shortenedLogText(text));
}

void LinuxLog::flush() {
  std::vector<LogFolding::Summary> due;
  {
    const MutexLock lock(mutex_);
    folding_.takeAll(due);
  }
  for (const auto& summary : due) _output(summary.level, summary.category, summary.text);
  output_->flush();
}

}  // namespace zelkord
