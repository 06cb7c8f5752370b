#pragma once

#include <memory>
#include <string>
#include <vector>

#include "halvane/DaemonFeedback.h"
#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/feedback/FeedbackRoom.h"
#include "zelkord/feedback/SessionStorage.h"
#include "zelkord/feedback/UserGUIDSource.h"

namespace zelkord {

// Containers that keep what they get.
struct RecordingContainer final : SessionContainer {
  CZClientSession header;
  int headers = 0;
  std::vector<ZelkorFeedback> records;
  bool isClosed = false;

  void writeSessionHeader(const CZClientSession& session) override {
    header = session;
    ++headers;
  }
  void writeFeedback(const ZelkorFeedback& feedback, std::function<void()> done) override {
    if (isClosed) return;
    records.push_back(feedback);
    records.back().held = nullptr;
    if (done) done();
  }
  std::optional<StoredSession> read() override { return StoredSession{header, records}; }
  // What the session says of its end; none while it is open, and for the ends that are not
  // recorded.
  std::optional<std::string> endReason() const {
    if (records.empty()) return std::nullopt;
    const auto* end = dynamic_cast<const ZelkorSessionEndFeedback*>(records.back().feedback.get());
    return end ? std::optional<std::string>(end->reason.text()) : std::nullopt;
  }
  std::string previousEndReason() const {
    return std::string(header.previousSessionEndReason.text());
  }
  std::vector<std::string> classes() const {
    std::vector<std::string> names;
    for (const auto& record : records) names.emplace_back(record.feedback->className());
    return names;
  }
};

struct RecordingStorage final : SessionStorage {
  std::vector<std::shared_ptr<RecordingContainer>> containers;  // every one ever made
  bool isFull = false;

  std::shared_ptr<SessionContainer> createFileContainerForWriting(SessionKind,
                                                                  const std::string&) override {
    if (isFull) return nullptr;
    containers.push_back(std::make_shared<RecordingContainer>());
    return containers.back();
  }
  void closeSession(std::shared_ptr<SessionContainer> container) override {
    static_cast<RecordingContainer&>(*container).isClosed = true;
  }
  std::vector<std::shared_ptr<SessionContainer>> getAvailableSessionHandles() override {
    std::vector<std::shared_ptr<SessionContainer>> closed;
    for (const auto& container : containers) {
      if (container->isClosed) closed.push_back(container);
    }
    return closed;
  }
  void deleteSessionWithFileContainer(std::shared_ptr<SessionContainer> container) override {
    std::erase(containers, container);
  }
  void waitForPendingWrites() override {}
};

// User identifiers that change when the test says so.
struct CountedGUIDs final : UserGUIDSource {
  std::uint8_t current = 1;
  int resets = 0;

  UUID currentUserGUID() override { return UUID{{current}}; }
  void reset() override {
    ++current;
    ++resets;
  }
};

// What sessions need, on the manual timeline.
struct SessionsBed {
  explicit SessionsBed(bool shared = true) : assembly(fakes.platform()) {
    assembly.setSharedSession(shared);
    assembly.persistentStorage.set(storage);
    assembly.guidController.set(guids);
  }

  static ZelkorFeedback record(std::shared_ptr<const HVFeedback> feedback,
                               std::optional<std::string> agent = "Lanthe/9") {
    ZelkorFeedback record;
    record.feedback = std::move(feedback);
    record.userAgent = std::move(agent);
    return record;
  }
  template <typename T>
  static ZelkorFeedback record(std::optional<std::string> agent = "Lanthe/9") {
    return record(std::make_shared<T>(), std::move(agent));
  }
  std::int64_t counter(const std::string& key) { return fakes.counters.value(key); }

  FakePlatform fakes;
  Assembly assembly;
  const std::shared_ptr<RecordingStorage> storage = std::make_shared<RecordingStorage>();
  const std::shared_ptr<CountedGUIDs> guids = std::make_shared<CountedGUIDs>();
  const std::shared_ptr<FeedbackRoom> room = std::make_shared<FeedbackRoom>(assembly);
};

}  // namespace zelkord
