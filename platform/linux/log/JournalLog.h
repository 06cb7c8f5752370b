#pragma once

#include <functional>
#include <string>
#include <vector>

#include "platform/linux/log/LogOutput.h"

namespace zelkord {

// Log entries in the system's journal: SUBSYSTEM is "com.quenta.zelkord", CATEGORY the entry's. The
// journal stamps entries itself and keeps line breaks.
//
// Threading: any thread.
class JournalLog final : public LogOutput {
 public:
  // Gets each entry's fields, "NAME=value".
  using Sender = std::function<void(const std::vector<std::string>& fields)>;

  JournalLog();  // the real journal
  explicit JournalLog(Sender sender) : sender_(std::move(sender)) {}

  // Whether a journal listens on this machine.
  static bool isThere();

  void write(WallTime time, LogLevel level, std::string_view category,
             std::string_view text) override;
  void flush() override {}

 private:
  const Sender sender_;
};

}  // namespace zelkord
