#include "platform/linux/log/FileLog.h"

#include <fcntl.h>
#include <spdlog/sinks/rotating_file_sink.h>
#include <sys/stat.h>

#include <atomic>
#include <cerrno>
#include <cstdio>

#include "platform/linux/log/LogLine.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord {
namespace {

constexpr std::size_t kLogFileSize = 8 << 20;
constexpr std::size_t kOldLogFiles = 4;

// Makes the file when it is missing, closed to others from its first moment on. Throws when the
// path has anything but a regular file, at which opening could also wait.
void makeLogFile(const std::string& path) {
  constexpr int kFlags = O_CREAT | O_WRONLY | O_APPEND | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK;
  const Descriptor file(::open(path.c_str(), kFlags, 0600));
  const int number = errno;
  if (const auto error = FileLog::refusal(path)) throw spdlog::spdlog_ex(*error->reason());
  if (!file) throw spdlog::spdlog_ex(path, number);
}

spdlog::file_event_handlers privateFileHandlers() {
  spdlog::file_event_handlers handlers;
  handlers.before_open = makeLogFile;
  handlers.after_open = [](const std::string&, std::FILE* file) { ::fchmod(::fileno(file), 0600); };
  return handlers;
}

}  // namespace

struct FileLog::Complaint {
  std::atomic_flag made;
};

std::optional<Error> FileLog::refusal(const std::string& path) {
  struct stat status {};
  if (path.empty() || ::lstat(path.c_str(), &status) != 0 || S_ISREG(status.st_mode)) {
    return std::nullopt;
  }
  auto error = posixError(EINVAL);
  error.userInfo["reason"] = path + " is no regular file";
  return error;
}

FileLog::FileLog(const std::string& path) : complaint_(std::make_unique<Complaint>()) {
  try {
    sink_ = std::make_shared<spdlog::sinks::rotating_file_sink_mt>(path, kLogFileSize, kOldLogFiles,
                                                                   false, privateFileHandlers());
    sink_->set_pattern("%v");
  } catch (const std::exception& error) {
    _complain(error.what());
  }
}

FileLog::~FileLog() = default;

void FileLog::_complain(const char* problem) {
  if (!complaint_->made.test_and_set()) std::fprintf(stderr, "zelkord: no log: %s\n", problem);
}

void FileLog::write(WallTime time, LogLevel level, std::string_view category,
                    std::string_view text) {
  if (!sink_) return;
  const auto line = logLine(time, level, category, text);
  try {
    sink_->log(spdlog::details::log_msg({}, spdlog::level::info, {line.data(), line.size()}));
    sink_->flush();
  } catch (const std::exception& error) {
    _complain(error.what());
  }
}

void FileLog::flush() {
  try {
    if (sink_) sink_->flush();
  } catch (const std::exception& error) {
    _complain(error.what());
  }
}

}  // namespace zelkord
