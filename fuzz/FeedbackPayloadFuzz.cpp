// Reads any bytes as feedback that a client reports, and uses what comes of them.

#include <cstdint>
#include <string>
#include <string_view>
#include <variant>

#include "base/Check.h"
#include "halvane/FeedbackClasses.h"
#include "zelkord/core/ClientQueryId.h"
#include "zelkord/core/FeedbackWire.h"
#include "zelkord/encoding/FeedbackEncoding.h"
#include "zelkord/feedback/ZelkorFeedback.h"

namespace zelkord {
namespace {

class NoLog final : public LogSink {
 public:
  bool isEnabled(LogLevel) const override { return true; }
  bool showsPrivateData() const override { return false; }
  void write(LogLevel, std::string_view, std::string_view) override {}
};

std::string messageOf(const HVFeedback& feedback) {
  std::string message;
  feedback.appendTo(message);
  return message;
}

// What was taken is a client's to say, and is stored as what it is.
void checkTaken(const HVFeedback& feedback) {
  const auto* known = feedbackClassNamed(feedback.className());
  ZK_CHECK(known && known->origin == FeedbackOrigin::Client, "a class of the clients'");
  const auto message = messageOf(feedback);
  auto fault = RecordFault::None;
  const auto again = readFeedback(*known, message, fault);
  ZK_CHECK(again && messageOf(*again) == message, "what is stored is read back the same");
}

void use(MutableFeedback feedback) {
  clientQueryIdOf(*feedback);
  NoLog sink;
  ZelkorFeedback record;
  record.feedback = std::move(feedback);
  std::string text;
  const bool isSent = record.appendDictionary(Logger(sink, ""), text);
  ZK_CHECK(isSent != text.empty(), "a record is sent whole or not at all");
  ZK_CHECK(!isSent || valueOfOwnJson(text).is_object(), "what is sent is a JSON object");
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  const std::string_view payload(reinterpret_cast<const char*>(data), size);
  auto decoded = decodeFeedbackPayload(payload);
  if (auto* feedback = std::get_if<MutableFeedback>(&decoded)) {
    checkTaken(**feedback);
    use(std::move(*feedback));
  }
  return 0;
}
