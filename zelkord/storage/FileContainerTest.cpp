#include <gmock/gmock.h>

#include <cerrno>

#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/storage/FileContainer.h"
#include "zelkord/storage/StorageTestSupport.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::IsSupersetOf;

constexpr const char* kPath = "/caches/session.0";
constexpr const char* kVersion = "Zelkord/1.0 (test)";
constexpr const char* kExceeded = "com.quenta.zelkord.filesizeexceeded";

std::vector<std::int64_t> queryIds(const std::optional<StoredSession>& session) {
  std::vector<std::int64_t> ids;
  if (session) {
    for (const auto& feedback : session->feedbacks) ids.push_back(feedback.queryId);
  }
  return ids;
}

class FileContainerTest : public testing::Test {
 protected:
  std::shared_ptr<FileContainer> existing(std::string bytes, std::uint64_t limit = 100'000) {
    fakes_.files.put(kPath, std::move(bytes));
    return std::make_shared<FileContainer>(services(limit), kPath);
  }
  std::shared_ptr<FileContainer> forWriting(std::uint64_t limit = 100'000) {
    fakes_.files.put(kPath, "");
    auto shared = services(limit);
    const auto place = shared->room->open(SessionKind::Managed, {});
    return std::make_shared<FileContainer>(std::move(shared), kPath, *place);
  }
  FileContainer::Services services(std::uint64_t limit) {
    auto& platform = fakes_.platform();
    return std::make_shared<const ContainerServices>(ContainerServices{
        .queue = fakes_.timeline.makeSerialQueue("storage"),
        .files = platform.files,
        .containerFiles = platform.containerFiles,
        .transactions = platform.transactions,
        .log = assembly_.log(Category::FeedbackStorage),
        .reporter = assembly_.reporter(),
        .room = std::make_shared<ContainerRoom>(platform.files, assembly_.limits(),
                                                assembly_.log(Category::FeedbackStorage)),
        .lastFile = std::make_shared<LastFile>(),
        .version = kVersion,
        .maxFileSize = limit});
  }
  // Writes records of those numbers; answers whose attempt was told of.
  std::vector<int> write(FileContainer& container, std::initializer_list<int> numbers) {
    std::vector<int> done;
    for (const int number : numbers) {
      container.writeFeedback(numberedFeedback(number),
                              [&done, number] { done.push_back(number); });
    }
    fakes_.timeline.runUntilIdle();
    return done;
  }
  std::size_t size() const { return fakes_.files.bytes(kPath)->size(); }

  FakePlatform fakes_;
  Assembly assembly_{fakes_.platform()};
};

TEST_F(FileContainerTest, ReadsBackWhatWasWritten) {
  const auto container = forWriting();
  container->writeSessionHeader(testHeader());
  auto feedback = numberedFeedback(7, 8, "{\"a\":1}");
  feedback.relTimestamp = 9;
  container->writeFeedback(feedback, nullptr);
  container->close();
  container->writeFeedback(numberedFeedback(10), [] { FAIL() << "the container is closed"; });
  const auto session = container->read();

  ASSERT_TRUE(session);
  EXPECT_EQ(fakes_.files.bytes(kPath),
            framed(kVersion) + framed(headerMessage()) + framed(storedMessage(feedback)));
  EXPECT_EQ(session->header.agent, "Testing/1.0");
  ASSERT_EQ(session->feedbacks.size(), 1u);
  const auto& read = session->feedbacks[0];
  EXPECT_EQ(read.queryId, 7);
  EXPECT_EQ(read.clientQueryId, 8u);
  EXPECT_EQ(read.relTimestamp, 0u);
  EXPECT_EQ(read.userAgent, "Testing/1.0");
  EXPECT_EQ(read.userGuid->string(), testHeader().userGuidString);
  EXPECT_EQ(dynamic_cast<const HVCustomFeedback&>(*read.feedback).jsonFeedback, "{\"a\":1}");
  EXPECT_THAT(fakes_.log.texts("Zelkor_Feedback_Storage"),
              ElementsAre("close file url /caches/session.0", "reading file url /caches/session.0",
                          "unarchive /caches/session.0"));
}

TEST_F(FileContainerTest, RefusesARecordThatWouldReachTheLimit) {
  const auto base = containerBytes(kVersion, 0).size();
  const auto record = framed(storedMessage(numberedFeedback(1))).size();
  for (const int spare : {0, 1}) {
    SCOPED_TRACE(spare);
    const auto container = forWriting(base + 2 * record + static_cast<std::size_t>(spare));
    container->writeSessionHeader(testHeader());
    EXPECT_THAT(write(*container, {1, 2, 3}), ElementsAre(1, 2, 3));
    EXPECT_EQ(size(), base + (spare == 0 ? 1 : 2) * record);
  }
  EXPECT_EQ(fakes_.counters.value(kExceeded), 3);
  EXPECT_EQ(fakes_.log.count("exceeds max session size"), 3);
  EXPECT_TRUE(fakes_.log.contains(
      fmt::format("bytes written ({}) + feedback ({}) exceeds max session size ({})", base + record,
                  record - 8, base + 2 * record)));
}

TEST_F(FileContainerTest, TakesASmallRecordAfterOneThatWasTooLarge) {
  const auto container = forWriting(1000);
  container->writeSessionHeader(testHeader());
  container->writeFeedback(numberedFeedback(1, 0, std::string(2000, 'x')), nullptr);
  container->writeFeedback(numberedFeedback(2), nullptr);
  EXPECT_THAT(queryIds(container->read()), ElementsAre(2));
  EXPECT_TRUE(fakes_.log.contains("file is already open closing it /caches/session.0"));
  EXPECT_EQ(fakes_.log.count(LogLevel::Fault), 1);
}

TEST_F(FileContainerTest, ClosesWithoutItsVersionOrItsHeader) {
  const auto version = framed(kVersion).size();
  const struct {
    std::uint64_t limit;
    std::vector<std::string> texts;
    std::size_t size;
  } cases[] = {{version, {"Could not write version string", "Could not write root object"}, 0},
               {version + 20, {"Could not write root object"}, version}};
  for (const auto& test : cases) {
    SCOPED_TRACE(test.limit);
    fakes_.log.clear();
    const auto container = forWriting(test.limit);
    container->writeSessionHeader(testHeader());
    EXPECT_THAT(write(*container, {1}), ElementsAre());
    EXPECT_EQ(size(), test.size);
    EXPECT_THAT(fakes_.log.texts(), IsSupersetOf(test.texts));
    EXPECT_EQ(fakes_.log.count("Could not write"), static_cast<int>(test.texts.size()));
  }
}

TEST_F(FileContainerTest, KeepsWhatFitsOnAFullDisk) {
  const auto container = forWriting();
  container->writeSessionHeader(testHeader());
  EXPECT_THAT(write(*container, {1}), ElementsAre(1));
  const auto record = framed(storedMessage(numberedFeedback(1))).size();
  fakes_.files.setRoomToAppend(2 * record);
  EXPECT_THAT(write(*container, {2, 3, 4, 5}), ElementsAre(2, 3, 4, 5));
  fakes_.files.setRoomToAppend(std::nullopt);
  EXPECT_THAT(write(*container, {6}), ElementsAre(6));
  EXPECT_EQ(fakes_.log.count("could not write to /caches/session.0"), 1);
  EXPECT_THAT(queryIds(container->read()), ElementsAre(1, 2, 3, 6));
}

TEST_F(FileContainerTest, OfAllFilesOnlyTheLastWrittenStaysOpen) {
  const auto shared = services(100'000);
  std::vector<std::shared_ptr<FileContainer>> containers;
  for (const char* path : {"/caches/session.1", "/caches/session.2"}) {
    fakes_.files.put(path, "");
    const auto place = shared->room->open(SessionKind::Managed, {});
    containers.push_back(std::make_shared<FileContainer>(shared, path, *place));
    containers.back()->writeSessionHeader(testHeader());
  }
  for (int number = 1; number <= 5; ++number) {
    write(*containers[number / 2 % 2], {number});
    EXPECT_EQ(fakes_.files.openForAppend(), 1);
  }
  EXPECT_THAT(queryIds(containers[0]->read()), ElementsAre(1, 4, 5));
  EXPECT_EQ(fakes_.files.openForAppend(), 0);
  EXPECT_THAT(queryIds(containers[1]->read()), ElementsAre(2, 3));
}

TEST_F(FileContainerTest, TellsWhenItsFileIsGoneOrCutOnceItHasWritten) {
  for (const bool isGone : {true, false}) {
    SCOPED_TRACE(isGone);
    const auto container = forWriting();
    container->writeSessionHeader(testHeader());
    write(*container, {1});
    if (isGone) fakes_.files.remove(kPath);
    if (!isGone) fakes_.files.tear(kPath, 3);
    fakes_.log.clear();
    EXPECT_THAT(write(*container, {2, 3}), ElementsAre(2, 3));
    EXPECT_EQ(fakes_.log.count("could not write to /caches/session.0"), 1);
    EXPECT_EQ(fakes_.files.openForAppend(), 0);
    EXPECT_EQ(fakes_.files.bytes(kPath).value_or("").size(), isGone ? 0u : 3u);
  }
}

TEST_F(FileContainerTest, CutsOffWhatAFailedWriteLeft) {
  const auto container = forWriting();
  container->writeSessionHeader(testHeader());
  write(*container, {1});
  fakes_.files.put(kPath, *fakes_.files.bytes(kPath) + "half a rec");
  write(*container, {2});
  EXPECT_THAT(queryIds(container->read()), ElementsAre(1, 2));
}

TEST_F(FileContainerTest, GivesTheRoomOfAFailedWriteToOthers) {
  const auto record = framed(storedMessage(numberedFeedback(1))).size();
  const auto container = forWriting(containerBytes(kVersion, 0).size() + record + 1);
  container->writeSessionHeader(testHeader());
  fakes_.timeline.runUntilIdle();
  fakes_.files.fail(FakeFileManager::Operation::Append, EIO);
  write(*container, {1});
  fakes_.files.fail(FakeFileManager::Operation::Append, 0);
  write(*container, {2});
  EXPECT_THAT(queryIds(container->read()), ElementsAre(2));
  EXPECT_EQ(fakes_.counters.value(kExceeded), 0);
}

TEST_F(FileContainerTest, HoldsATransactionWhileItWrites) {
  const auto container = forWriting();
  container->writeSessionHeader(testHeader());
  std::vector<std::string> open;
  container->writeFeedback(numberedFeedback(1), [&] { open = fakes_.transactions.openNames(); });
  fakes_.timeline.runUntilIdle();
  EXPECT_THAT(open, ElementsAre("archiveObject"));
  EXPECT_THAT(fakes_.transactions.openNames(), ElementsAre());
}

TEST_F(FileContainerTest, PassesOverRecordsThatDoNotDecode) {
  // Payload of an unknown class; a custom type that stands in no table; no payload at all.
  const std::string unknown("\x0a\x07\x0a\x05Other", 9);
  auto wrong = std::make_shared<HVCustomFeedback>();
  wrong->feedbackType.value = 99;
  const auto outside = storedMessage({.feedback = wrong});
  const auto good = framed(storedMessage(numberedFeedback(1)));
  const auto head = containerBytes(kVersion, 0);
  const auto container = existing(head + good + framed(unknown) + framed(outside) +
                                  framed("\x10\x05") + framed("\xff") + good);
  EXPECT_THAT(queryIds(container->read()), ElementsAre(1, 1));
  const auto position = head.size() + good.size() + 8;
  EXPECT_EQ(fakes_.log.count("could not unarchive feedback range"), 3);
  EXPECT_TRUE(
      fakes_.log.contains(fmt::format("could not unarchive feedback range {} size 9", position)));
  EXPECT_EQ(fakes_.log.count("zelkor feedback expected"), 1);
}

TEST_F(FileContainerTest, GivesNoSessionOfADamagedFile) {
  const auto whole = containerBytes(kVersion, 1);
  const std::string zero(8, '\0');
  const struct {
    std::string bytes;
    const char* text;
  } cases[] = {
      {"", "mmap: {\"domain\":\"POSIXErrorDomain\",\"code\":22"},
      {framed("Zelkord/0.9") + framed(headerMessage()), "version not supported: Zelkord/0.9"},
      {"abc", "version string not stored"},
      {zero, "version string not stored"},
      {framed("\xff\xfe"), "version string not stored"},
      {framed(kVersion), "client session not stored"},
      {framed(kVersion) + framed("\xff"), "client session not stored"},
      {whole + zero + "x", "empty data file"},
      {whole + zero + "x", "erroneous file data length"},
      {whole + std::string(8, '\x7f') + "x", "broken version string in file"},
      {whole + "x", "erroneous file data length"},
      {std::string(100'001, 'x'), "Session too big to process"}};
  for (const auto& test : cases) {
    SCOPED_TRACE(test.text);
    fakes_.log.clear();
    EXPECT_FALSE(existing(test.bytes)->read());
    EXPECT_TRUE(fakes_.log.contains(test.text));
    EXPECT_EQ(fakes_.files.bytes(kPath), test.bytes);
  }
  EXPECT_EQ(fakes_.counters.value("com.quenta.zelkord.filetoolarge"), 1);
}

TEST_F(FileContainerTest, TellsWhyAFileCannotBeOpened) {
  const auto container = existing(containerBytes(kVersion, 1));
  fakes_.files.fail(FakeFileManager::Operation::Open, EACCES);
  EXPECT_FALSE(container->read());
  EXPECT_TRUE(fakes_.log.contains("Could not open file for reading /caches/session.0"));
  fakes_.files.remove(kPath);
  EXPECT_FALSE(container->read());
  EXPECT_TRUE(
      fakes_.log.contains("Attribute fetch error {\"domain\":\"POSIXErrorDomain\",\"code\":2"));
  for (const auto& [url, text] : {std::pair{"", "No file url available"},
                                  std::pair{"session.0", "url to path returned nil"}}) {
    EXPECT_FALSE(std::make_shared<FileContainer>(services(1000), url)->read());
    EXPECT_TRUE(fakes_.log.contains(text));
  }
}

}  // namespace
}  // namespace zelkord
