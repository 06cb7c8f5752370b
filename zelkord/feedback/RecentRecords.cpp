#include "zelkord/feedback/RecentRecords.h"

#include <utility>

#include "halvane/DaemonFeedback.h"

namespace zelkord {
namespace {

std::size_t bytesOf(const std::optional<std::string>& text) { return text ? text->size() : 0; }

std::size_t textBytes(const HVFeedback* feedback) {
  std::string message;
  if (feedback) feedback->appendTo(message);
  return message.size();
}

}  // namespace

void RecentRecords::add(ZelkorFeedback feedback) {
  Record record{std::move(feedback)};
  record.bytes = textBytes(record.feedback.feedback.get()) + bytesOf(record.feedback.userAgent);
  const MutexLock lock(mutex_);
  ++total_;
  bytes_ += record.bytes;
  records_.push_back(std::move(record));
  while (records_.size() > limit_ || (bytes_ > kMaximumBytes && records_.size() > 1)) {
    bytes_ -= records_.front().bytes;
    records_.pop_front();
  }
}

void RecentRecords::clear() {
  std::deque<Record> released;
  const MutexLock lock(mutex_);
  released.swap(records_);
  bytes_ = 0;
}

std::vector<ZelkorFeedback> RecentRecords::all() const {
  const MutexLock lock(mutex_);
  std::vector<ZelkorFeedback> all;
  for (const auto& record : records_) all.push_back(record.feedback);
  return all;
}

std::uint64_t RecentRecords::total() const {
  const MutexLock lock(mutex_);
  return total_;
}

}  // namespace zelkord
