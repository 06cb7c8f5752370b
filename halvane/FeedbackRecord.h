#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "halvane/Feedback.h"
#include "halvane/FeedbackDescription.h"
#include "halvane/RecordReader.h"
#include "halvane/RecordWriter.h"

namespace zelkor {

// What every kind of feedback has from what it says of itself: `T` has `kDescription` and
// `fields()`. Field 1 of every message is the timestamp.
template <typename T>
struct FeedbackRecord : HVFeedback {
  FeedbackKind kind() const final { return kKindOf<T>; }
  std::string_view className() const final {
    return family == FeedbackFamily::Message ? kMessageNameOf<T>.view() : T::kDescription.name;
  }
  std::uint32_t type() const override { return T::kDescription.type; }
  bool requiresQueryId() const override { return T::kDescription.queryIds == QueryIds::Sent; }
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
