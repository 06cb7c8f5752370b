#include "platform/linux/log/JournalLog.h"

#include <fmt/format.h>
#include <sys/uio.h>
#include <syslog.h>
#include <unistd.h>

// Without this the call's place in this file would go with every entry.
#define SD_JOURNAL_SUPPRESS_LOCATION
#include <systemd/sd-journal.h>

#include "platform/linux/log/LogLine.h"

namespace zelkord {
namespace {

int journalPriority(LogLevel level) {
  switch (level) {
    case LogLevel::Debug:
      return LOG_DEBUG;
    case LogLevel::Info:
      return LOG_INFO;
    case LogLevel::Default:
      return LOG_NOTICE;
    case LogLevel::Error:
      return LOG_ERR;
    case LogLevel::Fault:
      return LOG_CRIT;
  }
  return LOG_NOTICE;
}

void sendToJournal(const std::vector<std::string>& fields) {
  std::vector<iovec> pieces;
  for (const auto& field : fields)
    pieces.push_back({const_cast<char*>(field.data()), field.size()});
  ::sd_journal_sendv(pieces.data(), static_cast<int>(pieces.size()));
}

}  // namespace

JournalLog::JournalLog() : JournalLog(sendToJournal) {}

bool JournalLog::isThere() { return ::access("/run/systemd/journal/socket", W_OK) == 0; }

void JournalLog::write(WallTime, LogLevel level, std::string_view category, std::string_view text) {
  sender_({fmt::format("MESSAGE={}", text), fmt::format("PRIORITY={}", journalPriority(level)),
           "SYSLOG_IDENTIFIER=zelkord", "SUBSYSTEM=com.quenta.zelkord",
           fmt::format("CATEGORY={}", logCategoryName(category))});
}

}  // namespace zelkord
