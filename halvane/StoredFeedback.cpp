#include "halvane/StoredFeedback.h"

#include "halvane/FeedbackClasses.h"

namespace zelkor {
namespace {

// The message; the payload's view borrows.
struct Envelope {
  std::optional<CZFeedbackPayload> payload;
  std::int64_t queryId = 0;
  std::uint64_t clientQueryId = 0;
  std::uint64_t relTimestamp = 0;

  static constexpr auto fields() {
    using T = Envelope;
    return std::tuple{stored(1, "payload", &T::payload), stored(2, "query_id", &T::queryId),
                      stored(3, "client_query_id", &T::clientQueryId),
                      stored(4, "rel_timestamp", &T::relTimestamp)};
  }
};

}  // namespace

void appendStoredFeedback(const CZZelkorFeedback& record, std::string& bytes) {
  std::string message;
  Envelope envelope;
  if (record.feedback) {
    record.feedback->appendTo(message);
    envelope.payload = {record.feedback->className(), message};
  }
  envelope.queryId = record.queryId;
  envelope.clientQueryId = record.clientQueryId;
  envelope.relTimestamp = record.relTimestamp;
  appendRecord(envelope, bytes);
}

std::optional<CZZelkorFeedback> readStoredFeedback(std::string_view message, RecordFault& fault) {
  Envelope envelope;
  RecordReader reader(message);
  const bool good = reader.read(envelope);
  fault = reader.fault();
  if (!good) return std::nullopt;
  const auto* known =
      envelope.payload ? feedbackClassNamed(envelope.payload->feedbackClass) : nullptr;
  if (!known) {
    fault = RecordFault::Malformed;
    return std::nullopt;
  }
  CZZelkorFeedback record;
  record.feedback = readFeedback(*known, envelope.payload->feedback, fault);
  if (!record.feedback) return std::nullopt;
  record.queryId = envelope.queryId;
  record.clientQueryId = envelope.clientQueryId;
  record.relTimestamp = envelope.relTimestamp;
  return record;
}

}  // namespace zelkor
