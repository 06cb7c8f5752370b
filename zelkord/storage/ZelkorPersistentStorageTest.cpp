#include <gmock/gmock.h>

#include <cerrno>

#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/feedback/ClientSession.h"
#include "zelkord/storage/StorageTestSupport.h"
#include "zelkord/storage/ZelkorPersistentStorage.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::UnorderedElementsAre;

constexpr const char* kGone = "com.quenta.zelkord.limit.containers";

class ZelkorPersistentStorageTest : public testing::Test {
 protected:
  std::shared_ptr<ZelkorPersistentStorage> start() {
    auto storage = std::make_shared<ZelkorPersistentStorage>(assembly_);
    storage->start();
    return storage;
  }
  std::string url(const std::shared_ptr<SessionContainer>& container) {
    return container ? std::dynamic_pointer_cast<FileContainer>(container)->fileUrl() : "none";
  }
  std::vector<std::string> available(ZelkorPersistentStorage& storage) {
    std::vector<std::string> urls;
    for (const auto& container : storage.getAvailableSessionHandles()) {
      urls.push_back(url(container));
    }
    return urls;
  }
  // A session of one record, from its beginning to its end.
  void record(ZelkorPersistentStorage& storage, SessionKind kind, const std::string& text = "{}",
              std::int64_t pid = 7) {
    const auto session = storage.createFileContainerForWriting(kind, processHolder(pid));
    ASSERT_TRUE(session);
    session->writeSessionHeader(testHeader());
    session->writeFeedback(numberedFeedback(1, 0, text), nullptr);
    storage.closeSession(session);
    fakes_.timeline.runUntilIdle();
  }
  std::uint64_t bytesOnDisk() const {
    std::uint64_t bytes = 0;
    for (const auto& path : fakes_.files.paths()) bytes += fakes_.files.bytes(path)->size();
    return bytes;
  }
  std::string whole() { return containerBytes(*zelkordUserAgent(fakes_.device), 2); }

  FakePlatform fakes_;
  Assembly assembly_{fakes_.platform()};
};

TEST_F(ZelkorPersistentStorageTest, NumbersFilesBeyondThoseFound) {
  const struct {
    std::vector<const char*> found;
    const char* next;
  } cases[] = {{{}, "session.0"},
               {{"session.3", "session.7"}, "session.8"},
               {{"session.7", "session.3"}, "session.8"},
               {{"session.2147483648", "session.99999999999999999999"}, "session.0"},
               {{"session.", "session.-5", "session.5x", "session.+5", "session 5", "Session.5",
                 "bag.plist"},
                "session.0"},
               // The numbers go round.
               {{"session.2147483647", "session.0"}, "session.1"}};
  for (const auto& test : cases) {
    SCOPED_TRACE(test.next);
    FakePlatform fakes;
    Assembly assembly(fakes.platform());
    for (const auto* name : test.found) fakes.files.put("/caches/" + std::string(name), "x");
    const auto storage = std::make_shared<ZelkorPersistentStorage>(assembly);
    storage->start();
    EXPECT_EQ(url(storage->createFileContainerForWriting(SessionKind::Managed, {})),
              "/caches/" + std::string(test.next));
    for (const auto* name : test.found) {
      EXPECT_TRUE(fakes.files.bytes("/caches/" + std::string(name)));
    }
  }
}

TEST_F(ZelkorPersistentStorageTest, TakesTheNextFreeNumber) {
  const auto storage = start();
  fakes_.files.put("/caches/session.0", "somebody's");
  fakes_.files.putDirectory("/caches/session.1");
  EXPECT_EQ(url(storage->createFileContainerForWriting(SessionKind::Managed, {})),
            "/caches/session.2");
  EXPECT_EQ(fakes_.files.bytes("/caches/session.0"), "somebody's");
  EXPECT_EQ(fakes_.files.mode("/caches/session.2"), 0600u);
  EXPECT_TRUE(fakes_.log.contains("new file url /caches/session.2"));
}

TEST_F(ZelkorPersistentStorageTest, LeadsAContainerFromWritingToDeletion) {
  const auto storage = start();
  const auto session = storage->createFileContainerForWriting(SessionKind::Managed, {});
  session->writeSessionHeader(testHeader());
  session->writeFeedback(numberedFeedback(1), nullptr);
  EXPECT_THAT(available(*storage), ElementsAre());
  storage->closeSession(session);
  const auto handles = storage->getAvailableSessionHandles();
  ASSERT_EQ(handles.size(), 1u);
  EXPECT_TRUE(fakes_.log.contains("available file url /caches/session.0"));
  EXPECT_EQ(handles[0]->read()->feedbacks.size(), 1u);

  // An uploader's copy of the list outlives the file.
  storage->deleteSessionWithFileContainer(handles[0]);
  EXPECT_THAT(available(*storage), ElementsAre());
  EXPECT_FALSE(fakes_.files.bytes("/caches/session.0"));
  EXPECT_TRUE(fakes_.log.contains("delete file url /caches/session.0"));
  storage->deleteSessionWithFileContainer(handles[0]);
  fakes_.timeline.runUntilIdle();
  EXPECT_TRUE(fakes_.log.contains("File /caches/session.0 delete failed"));
}

// All that an upload needs of sessions it finds behind the assembly.
TEST_F(ZelkorPersistentStorageTest, AnUploadTakesWhatEndedAndLeavesNothing) {
  fakes_.files.put("/caches/session.3", "damaged");
  fakes_.files.put("/caches/session.4", whole());
  assembly_.persistentStorage.set(start());
  const auto open = ClientSession::make(assembly_, numberedFeedback(1));
  const auto ended = ClientSession::make(assembly_, numberedFeedback(1));
  for (int i = 2; i <= 3; ++i) ended->addFeedback(numberedFeedback(i));
  ended->sessionComplete();

  std::vector<std::size_t> records;
  auto& storage = *assembly_.persistentStorage();
  for (const auto& container : storage.getAvailableSessionHandles()) {
    auto session = container->read();
    storage.deleteSessionWithFileContainer(container);
    if (!session) continue;
    const auto sending = ClientSession::make(assembly_, *std::move(session))->getFeedbacksToSend();
    EXPECT_EQ(parseJson(sending.text)->at("fb").as_array().size(), sending.records);
    records.push_back(sending.records);
  }
  EXPECT_THAT(records, ElementsAre(2, 3));
  EXPECT_TRUE(storage.getAvailableSessionHandles().empty());
  EXPECT_THAT(fakes_.files.paths(), ElementsAre("/caches/session.5"));  // the open one's
}

TEST_F(ZelkorPersistentStorageTest, WritesEverythingBeforeItEnds) {
  auto storage = start();
  auto session = storage->createFileContainerForWriting(SessionKind::Managed, {});
  session->writeSessionHeader(testHeader());
  session->writeFeedback(numberedFeedback(1), nullptr);
  session->writeFeedback(numberedFeedback(2), nullptr);
  session.reset();
  storage->waitForPendingWrites();
  EXPECT_EQ(fakes_.files.bytes("/caches/session.0"), whole());
}

TEST_F(ZelkorPersistentStorageTest, FindsWhatAnEarlierProcessLeft) {
  fakes_.files.put("/caches/session.3", whole());
  fakes_.files.put("/caches/session.7", whole());
  fakes_.files.putDirectory("/caches/session.9");
  const auto storage = start();
  EXPECT_THAT(available(*storage), UnorderedElementsAre("/caches/session.3", "/caches/session.7"));
  EXPECT_EQ(storage->getAvailableSessionHandles()[0]->read()->feedbacks.size(), 2u);
}

TEST_F(ZelkorPersistentStorageTest, CutsAnEndedContainerBackToItsLastWholeRecord) {
  const auto bytes = whole();
  const auto lastRecord = framed(storedMessage(numberedFeedback(2))).size();
  for (std::size_t cut = 1; cut < lastRecord; ++cut) {
    SCOPED_TRACE(cut);
    fakes_.log.clear();
    fakes_.files.put("/caches/session.3", bytes.substr(0, bytes.size() - cut));
    const auto handles = start()->getAvailableSessionHandles();
    ASSERT_EQ(handles.size(), 1u);
    EXPECT_EQ(fakes_.files.bytes("/caches/session.3"), bytes.substr(0, bytes.size() - lastRecord));
    EXPECT_EQ(fakes_.log.count("cut /caches/session.3 back from"), 1);
    EXPECT_EQ(handles[0]->read()->feedbacks.size(), 1u);
  }
}

TEST_F(ZelkorPersistentStorageTest, LeavesDamageAsItIs) {
  const auto damaged = whole() + std::string(8, '\0') + "x";
  fakes_.files.put("/caches/session.1", damaged);
  fakes_.files.put("/caches/session.2", "");
  const auto storage = start();
  for (const auto& container : storage->getAvailableSessionHandles()) {
    EXPECT_FALSE(container->read());
  }
  EXPECT_EQ(fakes_.files.bytes("/caches/session.1"), damaged);
  EXPECT_EQ(available(*storage).size(), 2u);
}

TEST_F(ZelkorPersistentStorageTest, WhatEndedFirstGoesWhenThereAreTooManyFiles) {
  const auto storage = start();
  const auto open = storage->createFileContainerForWriting(SessionKind::Managed, {});
  for (int i = 1; i <= 600; ++i) record(*storage, SessionKind::Managed);
  EXPECT_EQ(fakes_.counters.value(kGone), 0);
  for (int i = 601; i <= 2000; ++i) record(*storage, SessionKind::OneOff, "{}", i % 4);
  const auto kept = available(*storage);
  // One-off sessions keep to their part; beyond it the first of theirs went, not others.
  EXPECT_EQ(kept.size(), 1023u);
  EXPECT_EQ(kept.front(), "/caches/session.90");
  EXPECT_EQ(kept.back(), "/caches/session.2000");
  EXPECT_EQ(fakes_.files.paths().size(), 1024u);
  EXPECT_TRUE(fakes_.files.bytes("/caches/session.0"));  // is still open
  EXPECT_EQ(fakes_.counters.value(kGone), 2001 - 1024);
  EXPECT_EQ(fakes_.log.count("limit containers reached by pid "), 1);
  EXPECT_EQ(fakes_.counters.value("com.quenta.zelkord.limit.containers_full"), 0);
}

TEST_F(ZelkorPersistentStorageTest, WhatEndedFirstGoesWhenThereAreTooManyBytes) {
  const auto storage = start();
  const std::string large(1'000'000, 'x');
  for (int i = 0; i < 5; ++i) record(*storage, SessionKind::Managed, large);
  for (int i = 0; i < 300; ++i) record(*storage, SessionKind::OneOff, large, i % 5);
  EXPECT_EQ(available(*storage).size(), 5u + 67);
  for (int i = 0; i < 300; ++i) record(*storage, SessionKind::Managed, large);
  EXPECT_EQ(available(*storage).size(), 268u);
  EXPECT_EQ(available(*storage).back(), "/caches/session.604");
  EXPECT_LE(bytesOnDisk(), std::uint64_t{256} << 20);
  EXPECT_EQ(fakes_.counters.value(kGone), 605 - 268);
}

TEST_F(ZelkorPersistentStorageTest, AProcessDrivesOutOnlyItsOwnSessionsForOneOccasion) {
  const auto storage = start();
  record(*storage, SessionKind::OneOff, "{}", 1);
  record(*storage, SessionKind::Managed);
  for (int i = 2; i < 302; ++i) record(*storage, SessionKind::OneOff, "{}", 2);
  const std::string large(1'000'000, 'x');
  for (int i = 302; i < 402; ++i) record(*storage, SessionKind::OneOff, large, 3);
  EXPECT_EQ(available(*storage).size(), 2u + 128 + 16);
  EXPECT_TRUE(fakes_.files.bytes("/caches/session.0"));
  EXPECT_FALSE(fakes_.files.bytes("/caches/session.173"));
  EXPECT_TRUE(fakes_.files.bytes("/caches/session.174"));
  // Many processes fill the part of all: whoever has most gives way.
  for (int pid = 10; pid < 20; ++pid) {
    for (int i = 0; i < 15; ++i) record(*storage, SessionKind::OneOff, large, pid);
  }
  for (const char* small : {"/caches/session.0", "/caches/session.1", "/caches/session.174"}) {
    EXPECT_TRUE(fakes_.files.bytes(small)) << small;
  }
}

TEST_F(ZelkorPersistentStorageTest, RefusesWhatOpenContainersLeaveNoPlaceFor) {
  const auto storage = start();
  std::vector<std::shared_ptr<SessionContainer>> open;
  for (int i = 0; i < 1024; ++i) {
    open.push_back(storage->createFileContainerForWriting(SessionKind::Managed, {}));
  }
  EXPECT_EQ(url(storage->createFileContainerForWriting(SessionKind::Managed, {})), "none");
  EXPECT_EQ(url(storage->createFileContainerForWriting(SessionKind::OneOff, {})), "none");
  EXPECT_EQ(fakes_.counters.value("com.quenta.zelkord.limit.containers_full"), 2);
  EXPECT_EQ(fakes_.files.paths().size(), 1024u);
  open.pop_back();  // nobody completed its session
  EXPECT_EQ(url(storage->createFileContainerForWriting(SessionKind::Managed, {})),
            "/caches/session.1024");
}

TEST_F(ZelkorPersistentStorageTest, TheOldestThatAnEarlierProcessLeftGoAtTheStart) {
  const auto now = fakes_.timeline.wallNow();
  for (int i = 0; i < 1500; ++i) {
    const auto path = "/caches/session." + std::to_string(i);
    fakes_.files.put(path, "x");
    fakes_.files.setCreated(path, now - (i < 476 ? 1h : 2h));
  }
  const auto kept = available(*start());
  ASSERT_EQ(kept.size(), 1024u);
  EXPECT_EQ(kept.front(), "/caches/session.952");
  EXPECT_EQ(kept.back(), "/caches/session.475");
  EXPECT_EQ(fakes_.files.paths().size(), 1024u);
  EXPECT_EQ(fakes_.counters.value(kGone), 476);
}

TEST_F(ZelkorPersistentStorageTest, DeletesWhatIsTooOld) {
  const auto now = fakes_.timeline.wallNow();
  const auto keptAt = [&](WallTime clock) {
    fakes_.files.put("/caches/session.1", whole());
    fakes_.files.setCreated("/caches/session.1", now - 48h - 1s);
    fakes_.files.put("/caches/session.2", whole());
    fakes_.files.setCreated("/caches/session.2", now - 48h);
    fakes_.timeline.setWall(clock);
    return available(*start()).size();
  };
  EXPECT_EQ(keptAt(now - 24h), 2u);
  EXPECT_EQ(keptAt(now), 1u);
  EXPECT_FALSE(fakes_.files.bytes("/caches/session.1"));
  EXPECT_EQ(fakes_.counters.value("com.quenta.zelkord.filetooold"), 1);
  EXPECT_EQ(keptAt(now + 365 * 24h), 0u);
  fakes_.settings.set("ZLKSessionMaxAge", 1e9);
  EXPECT_EQ(keptAt(now + 365 * 24h), 2u);
}

TEST_F(ZelkorPersistentStorageTest, LivesWithACachesDirectoryThatFails) {
  using Operation = FakeFileManager::Operation;
  const struct {
    Operation operation;
    const char* text;
  } cases[] = {{Operation::List, "error scanning cache directory {"},
               {Operation::CreateExclusively, "Could not get a file url"},
               {Operation::OpenForAppending, "Could not open file for writing /caches/session.0"}};
  for (const auto& test : cases) {
    SCOPED_TRACE(test.text);
    fakes_.log.clear();
    fakes_.files.fail(test.operation, EACCES);
    const auto storage = start();
    const auto container = storage->createFileContainerForWriting(SessionKind::Managed, {});
    EXPECT_EQ(container == nullptr, test.operation != Operation::List);
    EXPECT_EQ(fakes_.files.paths().size(), container ? 1u : 0u);
    EXPECT_TRUE(fakes_.log.contains(test.text));
    fakes_.files.fail(test.operation, 0);
    fakes_.files.remove("/caches/session.0");
  }
}

}  // namespace
}  // namespace zelkord
