#include "zelkord/storage/SessionUnarchiver.h"

#include "base/Text.h"
#include "zelkord/storage/ContainerFormat.h"

namespace zelkord {
namespace {

// Of a stored record, whether it holds any feedback.
struct PayloadOnly {
  std::optional<CZFeedbackPayload> payload;

  static constexpr auto fields() { return std::tuple{stored(1, "payload", &PayloadOnly::payload)}; }
};

bool holdsNothing(std::string_view message) {
  PayloadOnly envelope;
  return RecordReader(message).read(envelope) && !envelope.payload;
}

}  // namespace

std::optional<StoredSession> SessionUnarchiver::read(std::string_view version) {
  if (!_checkVersion(version) || !_readHeader() || !_readFeedbacks()) return std::nullopt;
  return std::move(session_);
}

bool SessionUnarchiver::_checkVersion(std::string_view version) {
  const auto found = records_.readNextObject();
  if (!found || !isValidUtf8(*found)) {
    log_.error("version string not stored");
    return false;
  }
  if (*found == version) return true;
  log_.error("version not supported: {}", *found);
  return false;
}

bool SessionUnarchiver::_readHeader() {
  const auto message = records_.readNextObject();
  if (!message || !RecordReader(*message).read(session_.header)) {
    log_.error("client session not stored");
    return false;
  }
  userGuid_ = UUID::fromString(session_.header.userGuidString);
  if (!session_.header.agent.empty()) userAgent_ = session_.header.agent;
  return true;
}

bool SessionUnarchiver::_readFeedbacks() {
  session_.feedbacks.reserve(countRecords(records_.data().view().substr(records_.position())));
  while (records_.hasMore()) {
    const auto payload = records_.readNextObject();
    if (!payload) break;
    _addFeedback(*payload);
  }
  if (records_.position() == records_.data().size()) return true;
  log_.error("erroneous file data length");
  return false;
}

void SessionUnarchiver::_addFeedback(std::string_view payload) {
  RecordFault fault = RecordFault::None;
  auto stored = readStoredFeedback(payload, fault);
  if (!stored) return _refuse(payload);
  session_.feedbacks.push_back({.feedback = std::move(stored->feedback),
                                .queryId = stored->queryId,
                                .userGuid = userGuid_,
                                .userAgent = userAgent_,
                                .clientQueryId = stored->clientQueryId,
                                .relTimestamp = stored->relTimestamp});
}

void SessionUnarchiver::_refuse(std::string_view payload) const {
  if (holdsNothing(payload)) {
    log_.error("zelkor feedback expected");
  } else {
    log_.error("could not unarchive feedback range {} size {}",
               records_.position() - payload.size(), payload.size());
  }
}

}  // namespace zelkord
