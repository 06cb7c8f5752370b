#include "zelkord/feedback/RecentRecords.h"

#include <utility>

#include "zelkord/feedback/DaemonFeedback.h"

namespace zelkord {
namespace {

std::size_t bytesOf(const std::optional<std::string>& text) { return text ? text->size() : 0; }

// Of the texts that others choose.
std::size_t textBytes(const HVFeedback* feedback) {
  std::size_t bytes = 0;
  if (const auto* start = dynamic_cast<const HVStartNetworkSearchFeedback*>(feedback)) {
    bytes = start->input.size() + start->url.size();
    for (const auto& [name, value] : start->headers) bytes += name.size() + value.size();
  } else if (const auto* end = dynamic_cast<const ZLKEndNetworkSearchFeedback*>(feedback)) {
    bytes = bytesOf(end->zelkorStatus) + bytesOf(end->fbq) + bytesOf(end->partialClientIp);
  } else if (const auto* skipped = dynamic_cast<const ZLKSkipSearchFeedback*>(feedback)) {
    bytes = skipped->input.size();
  } else if (const auto* hit = dynamic_cast<const ZLKCacheHitFeedback*>(feedback)) {
    bytes = hit->input.size() + hit->uuid.size();
  } else if (const auto* failure = dynamic_cast<const HVErrorFeedback*>(feedback)) {
    for (const auto& [key, value] : failure->error.userInfo) bytes += key.size() + value.size();
  }
  return bytes;
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
