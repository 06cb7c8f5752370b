#include "zelkord/feedback/ClientSession.h"

#include <algorithm>

#include "halvane/DaemonFeedback.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/encoding/ErrorEncoding.h"
#include "zelkord/encoding/JsonWriting.h"
#include "zelkord/feedback/FeedbackSeams.h"
#include "zelkord/feedback/SessionProcessingHelper.h"
#include "zelkord/feedback/UserGUIDSource.h"

namespace zelkord {
namespace {

constexpr std::int64_t kDifferentUser = 500;  // in kZLKErrorDomain
// A container that was closed meanwhile never says that a record is on disk.
constexpr Duration kLongestWaitOfTests = 5s;

ZelkorFeedback errorRecord(const Error& error, std::optional<UUID> guid,
                           std::optional<std::string> agent) {
  ZelkorFeedback record;
  record.feedback = std::make_shared<HVErrorFeedback>(errorRecordOf(error));
  record.userGuid = guid;
  record.userAgent = std::move(agent);
  return record;
}

bool hidesTheTime(const HVFeedback& opening) {
  const auto* custom = feedbackAs<HVCustomFeedback>(opening);
  return custom && custom->feedbackType.value == HVCustomFeedback::kLantheResultFeatures;
}

std::vector<CZResourceVersion> versionsOf(const std::map<std::string, std::string>& versions) {
  std::vector<CZResourceVersion> list;
  for (const auto& [identifier, version] : versions) list.push_back({identifier, version});
  return list;
}

// Gives each record its milliseconds since the first; a first of 0 makes the next one the first.
void setRelativeTimestamps(std::vector<ZelkorFeedback>& records) {
  std::uint64_t base = 0;
  for (auto& record : records) {
    const auto timestamp = record.feedback->timestamp;
    if (base == 0) base = timestamp;
    record.relTimestamp = timestamp > base ? millisecondsOf(timestamp - base) : 0;
  }
}

}  // namespace

ClientSession::ClientSession(Assembly& assembly, Opening opening)
    : assembly_(assembly),
      sessionQueue_(
          assembly.platform().queues.makeSerialQueue("com.quenta.zelkord.clientSessionQueue")),
      firstUseDate_(opening.firstUseDate) {
  const MutexLock lock(headerMutex_);
  header_ = std::move(opening.header);
  userGuid_ = UUID::fromString(header_.userGuidString);
}

std::shared_ptr<ClientSession> ClientSession::make(Assembly& assembly,
                                                   std::optional<ZelkorFeedback> feedback,
                                                   SessionEndReason previousSessionEndReason,
                                                   SessionKind kind) {
  auto opening = _opening(assembly, feedback, previousSessionEndReason);
  std::shared_ptr<ClientSession> session(new ClientSession(assembly, std::move(opening)));
  session->_open(std::move(feedback), kind);
  return session;
}

std::shared_ptr<ClientSession> ClientSession::make(Assembly& assembly, StoredSession stored) {
  std::shared_ptr<ClientSession> session(
      new ClientSession(assembly, {std::move(stored.header), std::nullopt}));
  session->sessionQueue_->sync([&] {
    session->sessionQueue_->assertCurrent();
    session->sessionFeedbacks_ = std::move(stored.feedbacks);
  });
  return session;
}

std::shared_ptr<ClientSession> ClientSession::createFeedbackSessionFromError(const Error& error,
                                                                             Assembly& assembly) {
  auto* guids = assembly.guidController();
  return make(assembly,
              errorRecord(error, guids ? std::optional(guids->currentUserGUID()) : std::nullopt,
                          zelkordUserAgent(assembly.platform().device)),
              SessionEndReason::None, SessionKind::OneOff);
}

ClientSession::Opening ClientSession::_opening(Assembly& assembly,
                                               const std::optional<ZelkorFeedback>& feedback,
                                               SessionEndReason previousSessionEndReason) {
  const std::optional<std::string> agent = feedback ? feedback->userAgent : SharedText();
  CZClientSession header;
  header.agent = agent.value_or("");
  if (feedback && feedback->userGuid) header.userGuidString = feedback->userGuid->string();
  header.previousSessionEndReason = static_cast<std::int32_t>(previousSessionEndReason);
  header.removeTimestamps = feedback && hidesTheTime(*feedback->feedback);
  header.sessionStartSince1970 = secondsSince1970(assembly.platform().clock.wallNow());
  FirstUse firstUse(assembly, agent);
  if (agent) assembly.reporter().addValue(1, createAggdKey(*agent, "sessions"));
  header.firstUseOfTheDay = firstUse._firstUseOfTheDay(agent);
  if (auto* versions = assembly.downloadManager()) {
    header.cpResourceVersions = versionsOf(versions->resourceVersions());
  }
  return {std::move(header), firstUse.firstUseDate()};
}

void ClientSession::_open(std::optional<ZelkorFeedback> feedback, SessionKind kind) {
  auto* storage = assembly_.persistentStorage();
  const auto holder = feedback ? feedbackHolder(*feedback) : std::string();
  const auto container = storage ? storage->createFileContainerForWriting(kind, holder) : nullptr;
  storageHandle_.set(container);
  if (container) container->writeSessionHeader(header());
  if (feedback) addFeedback(*std::move(feedback));
}

std::optional<std::string> ClientSession::agent() const {
  const MutexLock lock(headerMutex_);
  return header_.agent.empty() ? std::nullopt : std::optional(header_.agent);
}

void ClientSession::setAgent(std::optional<std::string> agent) {
  const MutexLock lock(headerMutex_);
  header_.agent = std::move(agent).value_or("");
}

std::optional<UUID> ClientSession::userGuid() const {
  const MutexLock lock(headerMutex_);
  return userGuid_;
}

void ClientSession::setUserGuid(const std::optional<UUID>& guid) {
  const MutexLock lock(headerMutex_);
  userGuid_ = guid;
  header_.userGuidString = guid ? guid->string() : "";
}

CZClientSession ClientSession::header() const {
  const MutexLock lock(headerMutex_);
  return header_;
}

std::optional<WallTime> ClientSession::sessionStart() const {
  const MutexLock lock(headerMutex_);
  const auto& start = header_.sessionStartSince1970;
  return start ? std::optional(wallTimeOfSeconds(*start)) : std::nullopt;
}

std::map<std::string, std::string> ClientSession::resourceVersions() const {
  const MutexLock lock(headerMutex_);
  std::map<std::string, std::string> versions;
  for (const auto& entry : header_.cpResourceVersions) versions[entry.identifier] = entry.version;
  return versions;
}

void ClientSession::addFeedback(ZelkorFeedback feedback) {
  if (!feedback.feedback) {
    assembly_.log(Category::FeedbackErrors).error("attempted to add a nil feedback");
    return;
  }
  if (!agent()) setAgent(feedback.userAgent);
  _addFeedback(feedback);
  if (!_isOfAnotherUser(feedback)) return;
  _addFeedback(errorRecord(zelkorError(kDifferentUser, "different guid in session"), std::nullopt,
                           std::move(feedback.userAgent)));
}

bool ClientSession::_isOfAnotherUser(const ZelkorFeedback& feedback) const {
  const MutexLock lock(headerMutex_);
  return !header_.userGuidString.empty() && userGuid_ != feedback.userGuid;
}

void ClientSession::_addFeedback(ZelkorFeedback feedback) {
  stamp(feedback, assembly_.platform().clock);
  if (auto* streams = assembly_.flusherXPCListener()) {
    streams->sendDataToReceivingStreamListener(feedback);
  }
  auto done = assembly_.testFeedbacks() ? _keepForTests(feedback) : nullptr;
  if (const auto container = storageHandle_.get()) {
    container->writeFeedback(feedback, std::move(done));
  } else if (done) {
    done();
  }
}

std::function<void()> ClientSession::_keepForTests(const ZelkorFeedback& feedback) {
  const std::shared_ptr<Semaphore> written = assembly_.platform().queues.makeSemaphore(0);
  sessionQueue_->async([self = shared_from_this(), feedback, written] {
    self->sessionQueue_->assertCurrent();
    written->wait(kLongestWaitOfTests);
    self->sessionFeedbacks_.push_back(feedback);
    self->sessionFeedbacks_.back().held = nullptr;
  });
  return [written] { written->signal(); };
}

void ClientSession::sessionComplete() {
  sessionQueue_->sync([this] {
    auto* storage = assembly_.persistentStorage();
    auto container = storageHandle_.get();
    if (!storage || !container) {
      assembly_.log(Category::Session).fault("Storage Handle nil major error");
      return;
    }
    storage->closeSession(std::move(container));
  });
}

void ClientSession::enumerateSessions(const Visitor& visitor) { visitor(*this, true); }

std::vector<ZelkorFeedback> ClientSession::getSessionFeedbacks() {
  std::vector<ZelkorFeedback> records;
  sessionQueue_->sync([&] {
    sessionQueue_->assertCurrent();
    records = sessionFeedbacks_;
  });
  std::stable_sort(records.begin(), records.end(),
                   [](const auto& a, const auto& b) { return timeStampComparator(a, b) < 0; });
  return records;
}

std::vector<std::string> ClientSession::feedbacksWithRelativeTimestamp() {
  auto records = getSessionFeedbacks();
  setRelativeTimestamps(records);
  std::vector<std::string> texts;
  for (const auto& record : records) {
    std::string text;
    if (record.appendDictionary(assembly_.log(Category::FeedbackErrors), text)) {
      texts.push_back(std::move(text));
    }
  }
  return texts;
}

// What a record names but none describes, as a record of the session.
template <typename Missing, typename Items, typename Visit>
void ClientSession::_visitMissing(Items items, const Visit& visit) const {
  if (items.empty()) return;
  ZelkorFeedback record;
  record.feedback = std::make_shared<Missing>(std::move(items));
  record.userGuid = userGuid();
  record.userAgent = agent();
  visit(record);
}

// What is named only later stands first: the records are prepared before any is visited.
template <typename Visit>
void ClientSession::_visitFilteredRecords(const Visit& visit) {
  auto records = getSessionFeedbacks();
  setRelativeTimestamps(records);
  SessionProcessingHelper helper;
  for (auto& record : records) record.process(helper);
  _visitMissing<ZelkorSessionMissingSuggestions>(helper.missingSuggestions(), visit);
  _visitMissing<ZelkorSessionMissingResults>(helper.missingResults(), visit);
  for (const auto& record : records) visit(record);
}

std::vector<std::string> ClientSession::privacyFilteredFeedbacksWithRelativeTimestamp() {
  std::vector<std::string> texts;
  _visitFilteredRecords([&](const ZelkorFeedback& record) {
    std::string text;
    if (record.appendDictionary(assembly_.log(Category::FeedbackErrors), text)) {
      texts.push_back(std::move(text));
    } else {
      _countNotSent();
    }
  });
  return texts;
}

std::size_t ClientSession::_appendFilteredRecords(std::string& text) {
  const auto& errors = assembly_.log(Category::FeedbackErrors);
  std::size_t appended = 0;
  _visitFilteredRecords([&](const ZelkorFeedback& record) {
    const auto old = text.size();
    if (appended > 0) text += ',';
    if (record.appendDictionary(errors, text)) {
      ++appended;
    } else {
      text.resize(old);
      _countNotSent();
    }
  });
  return appended;
}

void ClientSession::_countNotSent() const { assembly_.reporter().addValue(1, kFeedbackNotSent); }

FeedbacksToSend ClientSession::getFeedbacksToSend() {
  const auto header = this->header();
  const bool hasBaseTime = !header.removeTimestamps && header.sessionStartSince1970;
  std::string text = R"({"fb":[)";
  const auto records = _appendFilteredRecords(text);
  text += R"(],"agent":)";
  appendJsonString(header.agent, text);
  text += R"(,"user_guid":)";
  const auto guid = userGuid();
  appendJsonString(guid ? guid->string() : "", text);
  text += R"(,"resource_versions":)";
  appendJson(resourceVersions(), text);
  text += R"(,"first_use":)";
  appendJson(header.firstUseOfTheDay, text);
  text += R"(,"base_time":)";
  appendJsonInteger(hasBaseTime ? static_cast<std::int64_t>(*header.sessionStartSince1970) : 0,
                    text);
  text += R"(,"previous_session_end_reason":)";
  appendJson(header.previousSessionEndReason, text);
  text += '}';
  return {std::move(text), records};
}

}  // namespace zelkord
