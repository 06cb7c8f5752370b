#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "base/FunctionRef.h"
#include "base/Mutex.h"

namespace zelkord {

enum class RecordKind : std::uint8_t { Version, Header, Feedback };
// What the size limit says of a record. NoFile: the container was closed, or could not take its
// version.
enum class RecordFit : std::uint8_t { Fits, TooLarge, NoFile };

// One record on its way into a container. The bytes of those that fit stand in the batch.
struct WaitingRecord {
  RecordKind kind = RecordKind::Feedback;
  RecordFit fit = RecordFit::Fits;
  std::uint64_t offset = 0;   // in the file
  std::uint64_t payload = 0;  // bytes
  std::function<void()> done;
  std::shared_ptr<const void> held;  // until it is written

  // Its bytes in the batch.
  std::uint64_t size() const;
};

struct RecordBatch {
  std::string bytes;  // framed
  std::vector<WaitingRecord> records;

  // Keeps a little memory for the next one.
  void clear();
};

// The records that wait to be written to one container, already laid out as in the file.
//
// The size limit is applied when a record is added, to where it will stand: that is exact, and
// bounds the bytes that wait. A write that fails gives its room back.
//
// Threading: any thread; what one thread adds keeps its order.
class WaitingRecords final {
 public:
  // For a file of `length` bytes that may not reach `limit`.
  WaitingRecords(std::uint64_t length, std::uint64_t limit) : limit_(limit), end_(length) {}

  // Calls `wake` for the first record after a `take`, before anything else can be added. Feedback
  // for a closed container is forgotten.
  void add(RecordKind kind, std::string_view payload, std::function<void()> done,
           std::shared_ptr<const void> held, FunctionRef<void()> wake);
  // Takes all; `batch` must be clear.
  void take(RecordBatch& batch);
  // So many bytes could not be written.
  void giveBack(std::uint64_t bytes);
  // Nothing more is accepted.
  void close();
  bool isOpen() const;

 private:
  RecordFit _fit(RecordKind kind, std::uint64_t payload) ZK_REQUIRES(mutex_);

  const std::uint64_t limit_;
  mutable Mutex mutex_;
  std::uint64_t end_ ZK_GUARDED_BY(mutex_);  // of the file once all is written
  bool open_ ZK_GUARDED_BY(mutex_) = true;
  bool woken_ ZK_GUARDED_BY(mutex_) = false;
  RecordBatch waiting_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
