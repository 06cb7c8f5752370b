#pragma once

#include <atomic>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/Log.h"

namespace zelkord {

// Keeps what is logged, at every level. Private parts show as "<private>" unless told otherwise.
//
// Threading: any thread.
class RecordingLog final : public LogSink {
 public:
  struct Entry {
    LogLevel level;
    std::string category;
    std::string text;

    friend bool operator==(const Entry&, const Entry&) = default;
  };

  bool isEnabled(LogLevel) const override { return true; }
  bool showsPrivateData() const override { return showsPrivateData_; }
  void write(LogLevel level, std::string_view category, std::string_view text) override;

  void setShowsPrivateData(bool shows) { showsPrivateData_ = shows; }
  std::vector<Entry> entries() const;
  // The texts of one category, or of all.
  std::vector<std::string> texts(std::string_view category = {}) const;
  // Whether an entry's text contains that part.
  bool contains(std::string_view part) const { return count(part) > 0; }
  int count(std::string_view part) const;
  int count(LogLevel level) const;
  void clear();

 private:
  std::atomic<bool> showsPrivateData_ = false;
  mutable Mutex mutex_;
  std::vector<Entry> entries_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
