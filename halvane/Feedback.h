#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "base/Namespace.h"
#include "halvane/FeedbackKinds.h"

namespace zelkor {

class RecordReader;

// The type of feedback that has none of its own.
inline constexpr std::uint32_t kGenericFeedbackType = 21;

// Which of its two names a record goes by. The records are alike; a few keys are sent for one
// family only.
enum class FeedbackFamily : std::uint8_t { Model, Message };

// A record of something that happened in a search. Immutable once it is shared.
struct HVFeedback {
  HVFeedback() = default;
  HVFeedback(const HVFeedback&) = default;
  HVFeedback& operator=(const HVFeedback&) = default;
  virtual ~HVFeedback() = default;

  virtual FeedbackKind kind() const = 0;
  // The class's name, such as "HVErrorFeedback"; for the message family "CZErrorFeedback".
  virtual std::string_view className() const = 0;
  // Its row in the table of event types.
  virtual std::uint32_t type() const { return kGenericFeedbackType; }
  // Whether what is sent carries the query identifiers.
  virtual bool requiresQueryId() const { return true; }
  virtual std::unique_ptr<HVFeedback> clone() const = 0;
  // Appends the record's message (protocol buffers, proto3).
  virtual void appendTo(std::string& bytes) const = 0;
  // Bytes of that message.
  virtual std::size_t messageSize() const = 0;
  // Takes over what a message says. False when it does not parse; the reader knows why.
  virtual bool read(RecordReader& reader) = 0;

  std::uint64_t timestamp = 0;  // boot-time nanoseconds; 0: set when it is recorded
  FeedbackFamily family = FeedbackFamily::Model;
};

// The record itself, if it is of that kind; else null.
template <typename Record>
const Record* feedbackAs(const HVFeedback& feedback) {
  return feedback.kind() == kKindOf<Record> ? static_cast<const Record*>(&feedback) : nullptr;
}

}  // namespace zelkor
