#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "halvane/Feedback.h"
#include "halvane/RecordReader.h"
#include "halvane/RecordWriter.h"

namespace zelkor {

// What every kind of feedback has from its description: `T` has `kKind`, `kName` and `kMessageName`
// (its class in either family) and `fields()`. Field 1 of every message is the timestamp.
template <typename T>
struct FeedbackRecord : HVFeedback {
  FeedbackKind kind() const final { return T::kKind; }
  std::string_view className() const final {
    return family == FeedbackFamily::Message ? T::kMessageName : T::kName;
  }
  std::unique_ptr<HVFeedback> clone() const final {
    return std::make_unique<T>(static_cast<const T&>(*this));
  }
  void appendTo(std::string& bytes) const final {
    appendRecord(static_cast<const T&>(*this), kTimestamp, bytes);
  }
  std::size_t messageSize() const final {
    return recordSize(static_cast<const T&>(*this), kTimestamp);
  }
  bool read(RecordReader& reader) final { return reader.read(static_cast<T&>(*this), kTimestamp); }

 private:
  static constexpr auto kTimestamp = std::tuple{stored(1, "timestamp", &HVFeedback::timestamp)};
};

}  // namespace zelkor
