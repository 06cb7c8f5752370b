#include "platform/testing/RecordingLog.h"

#include <algorithm>

namespace zelkord {

void RecordingLog::write(LogLevel level, std::string_view category, std::string_view text) {
  const MutexLock lock(mutex_);
  entries_.push_back({level, std::string(category), std::string(text)});
}

std::vector<RecordingLog::Entry> RecordingLog::entries() const {
  const MutexLock lock(mutex_);
  return entries_;
}

std::vector<std::string> RecordingLog::texts(std::string_view category) const {
  std::vector<std::string> texts;
  for (auto& entry : entries()) {
    if (category.empty() || entry.category == category) texts.push_back(std::move(entry.text));
  }
  return texts;
}

int RecordingLog::count(std::string_view part) const {
  const auto all = entries();
  return static_cast<int>(std::count_if(all.begin(), all.end(), [&](const Entry& entry) {
    return entry.text.find(part) != std::string::npos;
  }));
}

int RecordingLog::count(LogLevel level) const {
  const auto all = entries();
  return static_cast<int>(std::count_if(all.begin(), all.end(),
                                        [&](const Entry& entry) { return entry.level == level; }));
}

void RecordingLog::clear() {
  const MutexLock lock(mutex_);
  entries_.clear();
}

}  // namespace zelkord
