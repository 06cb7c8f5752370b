#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <string>

#include "base/Mutex.h"
#include "platform/api/Clock.h"
#include "platform/api/Log.h"
#include "platform/linux/log/LogFolding.h"
#include "platform/linux/log/LogOutput.h"

namespace zelkord {

// The log of the daemon: a level, a rule about private data, and one output. What a single place in
// the code repeats, or writes too much of, is folded; no entry is longer than kLongestLogLine.
//
// Threading: any thread.
// Ownership: the clock, and what the rule refers to, outlive it.
class LinuxLog final : public LogSink {
 public:
  LinuxLog(std::unique_ptr<LogOutput> output, const Clock& clock, LogLevel level);

  // A file when `path` is given, else the journal, else `fallbackPath`.
  static std::unique_ptr<LogOutput> makeOutput(const std::string& path,
                                               const std::string& fallbackPath);

  // Asked at each entry. Without a rule nothing private shows: settings come later than the log,
  // and threads that watch the host may write before. At most once.
  void showPrivateDataWhen(std::function<bool()> rule) {
    rule_ = std::move(rule);
    hasRule_.store(true, std::memory_order_release);
  }

  bool isEnabled(LogLevel level) const override {
    return level >= level_ || level == LogLevel::Fault;
  }
  bool showsPrivateData() const override {
    return hasRule_.load(std::memory_order_acquire) && rule_();
  }
  void write(LogLevel level, std::string_view category, std::string_view text) override {
    writeFrom(nullptr, level, category, text);
  }
  void writeFrom(const void* place, LogLevel level, std::string_view category,
                 std::string_view text) override;
  // Tells what is folded, too.
  void flush();

 private:
  void _output(LogLevel level, std::string_view category, std::string_view text);

  const std::unique_ptr<LogOutput> output_;
  const Clock& clock_;
  const LogLevel level_;
  std::function<bool()> rule_;  // read once `hasRule_` is true
  std::atomic<bool> hasRule_ = false;
  Mutex mutex_;
  LogFolding folding_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
