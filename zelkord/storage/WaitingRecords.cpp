#include "zelkord/storage/WaitingRecords.h"

#include <utility>

#include "zelkord/storage/ContainerFormat.h"

namespace zelkord {

std::uint64_t WaitingRecord::size() const {
  return fit == RecordFit::Fits ? kLengthSize + payload : 0;
}

void RecordBatch::clear() {
  constexpr std::size_t kKeptBytes = 64 * 1024;
  constexpr std::size_t kKeptRecords = 512;
  bytes.clear();
  records.clear();
  if (bytes.capacity() > kKeptBytes) bytes.shrink_to_fit();
  if (records.capacity() > kKeptRecords) records.shrink_to_fit();
}

void WaitingRecords::add(RecordKind kind, std::string_view payload, std::function<void()> done,
                         std::shared_ptr<const void> held, FunctionRef<void()> wake) {
  const MutexLock lock(mutex_);
  if (!open_ && kind == RecordKind::Feedback) return;
  const auto fit = _fit(kind, payload.size());
  waiting_.records.push_back({kind, fit, end_, payload.size(), std::move(done), std::move(held)});
  if (fit == RecordFit::Fits) {
    appendFramed(payload, waiting_.bytes);
    end_ += kLengthSize + payload.size();
  }
  if (!std::exchange(woken_, true)) wake();
}

// A container without its version or its header takes nothing more.
RecordFit WaitingRecords::_fit(RecordKind kind, std::uint64_t payload) {
  if (!open_) return RecordFit::NoFile;
  if (end_ + kLengthSize + payload < limit_) return RecordFit::Fits;
  if (kind != RecordKind::Feedback) open_ = false;
  return RecordFit::TooLarge;
}

void WaitingRecords::take(RecordBatch& batch) {
  const MutexLock lock(mutex_);
  std::swap(batch, waiting_);
  woken_ = false;
}

void WaitingRecords::giveBack(std::uint64_t bytes) {
  const MutexLock lock(mutex_);
  end_ -= bytes;
}

void WaitingRecords::close() {
  const MutexLock lock(mutex_);
  open_ = false;
}

bool WaitingRecords::isOpen() const {
  const MutexLock lock(mutex_);
  return open_;
}

}  // namespace zelkord
