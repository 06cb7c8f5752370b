#include "zelkord/core/FeedbackWire.h"

#include <fmt/core.h>

#include "halvane/FeedbackClasses.h"
#include "halvane/StoredFeedback.h"

namespace zelkord {
namespace {

WireFault wireFaultOf(RecordFault fault, std::string_view what) {
  switch (fault) {
    case RecordFault::TooManyItems:
      return {ipc::kLimitsExceeded, fmt::format("{} holds too many items", what)};
    case RecordFault::UnknownValue:
      return {ipc::kInvalidArgs, fmt::format("{} has a value that is not in its table", what)};
    case RecordFault::Malformed:
    case RecordFault::None:
      break;
  }
  return {ipc::kInvalidArgs, fmt::format("{} does not parse", what)};
}

}  // namespace

Decoded<MutableFeedback> decodeFeedback(std::string_view feedbackClass, std::string_view message) {
  const auto* known = feedbackClassNamed(feedbackClass);
  if (!known) return WireFault{ipc::kInvalidArgs, "no such feedback class"};
  if (known->origin != FeedbackOrigin::Client) {
    return WireFault{ipc::kInvalidArgs, fmt::format("{} is the daemon's own", known->name)};
  }
  auto fault = RecordFault::None;
  MutableFeedback feedback = readFeedback(*known, message, fault);
  if (!feedback) return wireFaultOf(fault, known->name);
  return feedback;
}

Decoded<MutableFeedback> decodeFeedbackPayload(std::string_view payload) {
  CZFeedbackPayload parts;
  RecordReader reader(payload);
  if (!reader.read(parts)) return wireFaultOf(reader.fault(), "payload");
  return decodeFeedback(parts.feedbackClass, parts.feedback);
}

}  // namespace zelkord
