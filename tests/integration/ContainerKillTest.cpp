#include <gtest/gtest.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <random>
#include <thread>
#include <vector>

#include "platform/linux/files/LinuxContainerFiles.h"
#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformOnQueues.h"
#include "platform/testing/TemporaryDirectory.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/storage/StorageTestSupport.h"
#include "zelkord/storage/ZelkorPersistentStorage.h"

namespace zelkord {
namespace {

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr int kRounds = 20;
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
constexpr int kRounds = 20;
#else
constexpr int kRounds = 200;
#endif
#else
constexpr int kRounds = 200;
#endif

constexpr int kThreads = 4;
constexpr std::uint64_t kRecordsASession = 2000;  // of one thread

// What the process says before it is killed, in memory that outlives it.
struct Acknowledged {
  std::array<std::atomic<std::uint64_t>, kThreads> records;
};

// A storage on real files, with the queues that are given.
struct StorageOnDisk {
  StorageOnDisk(const std::string& directory, Clock& clock, WorkQueues& queues)
      : files({directory, directory, directory}),
        platform(onQueues(fakes.platform(), clock, queues, fakes.urlSessions, transactions, nullptr,
                          {&files, &containerFiles})) {
    fakes.settings.set("ZLKSessionSizeLimit", std::int64_t{1} << 30);
    fakes.settings.set("ZLKSessionMaxAge", 1e9);
    storage->start();
  }

  FakePlatform fakes;
  CountedTransactions transactions{fakes.timeline};
  LinuxFileManager files;
  LinuxContainerFiles containerFiles;
  Platform platform;
  Assembly assembly{platform};
  std::shared_ptr<ZelkorPersistentStorage> storage =
      std::make_shared<ZelkorPersistentStorage>(assembly);
};

// Numbered records of one thread, never many ahead of what is acknowledged.
void recordFrom(int thread, SessionContainer& container, std::uint64_t first,
                std::atomic<std::uint64_t>& acknowledged) {
  for (auto number = first; number < first + kRecordsASession; ++number) {
    while (number > acknowledged.load() + 200) std::this_thread::yield();
    container.writeFeedback(numberedFeedback(thread, number),
                            [&acknowledged, number] { acknowledged = number; });
  }
}

// Sessions one after the other, each recorded by all threads, until somebody ends the process.
[[noreturn]] void recordUntilKilled(const std::string& directory, Acknowledged& acknowledged) {
  LinuxClock clock;
  LinuxWorkQueues queues(clock, 2);
  StorageOnDisk disk(directory, clock, queues);
  for (std::uint64_t first = 1;; first += kRecordsASession) {
    const auto container = disk.storage->createFileContainerForWriting(SessionKind::Managed, {});
    container->writeSessionHeader(testHeader());
    std::vector<std::thread> threads;
    for (int thread = 0; thread < kThreads; ++thread) {
      threads.emplace_back([&, thread] {
        recordFrom(thread, *container, first,
                   acknowledged.records[static_cast<std::size_t>(thread)]);
      });
    }
    for (auto& thread : threads) thread.join();
    disk.storage->closeSession(container);
  }
}

class ContainerKillTest : public testing::Test {
 protected:
  ContainerKillTest()
      : acknowledged_(
            static_cast<Acknowledged*>(::mmap(nullptr, sizeof(Acknowledged), PROT_READ | PROT_WRITE,
                                              MAP_SHARED | MAP_ANONYMOUS, -1, 0))) {}
  void TearDown() override { ::munmap(acknowledged_, sizeof(Acknowledged)); }

  void recordAndKill() {
    for (auto& records : acknowledged_->records) records = 0;
    const pid_t child = ::fork();
    ASSERT_GE(child, 0);
    if (child == 0) recordUntilKilled(root_.path(), *acknowledged_);
    std::this_thread::sleep_for(std::chrono::microseconds(delay_(random_)));
    ::kill(child, SIGKILL);
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    ASSERT_TRUE(WIFSIGNALED(status)) << "the process ended by itself";
  }

  // Reads everything back, oldest session first, and deletes it.
  void readBack() {
    FakePlatform fakes;
    StorageOnDisk disk(root_.path(), fakes.timeline, fakes.timeline);
    auto handles = disk.storage->getAvailableSessionHandles();
    const auto number = [](const std::shared_ptr<SessionContainer>& handle) {
      const auto& url = static_cast<const FileContainer&>(*handle).fileUrl();
      return std::pair(url.size(), url);
    };
    std::sort(handles.begin(), handles.end(),
              [&](const auto& a, const auto& b) { return number(a) < number(b); });
    std::array<std::uint64_t, kThreads> last{};
    for (const auto& handle : handles) {
      if (const auto session = handle->read()) checkOrder(*session, last);
      disk.storage->deleteSessionWithFileContainer(handle);
    }
    disk.storage->waitForPendingWrites();
    for (std::size_t thread = 0; thread < kThreads; ++thread) {
      EXPECT_GE(last[thread], acknowledged_->records[thread]) << "acknowledged, but lost";
      total_ += last[thread];
    }
  }

  // Each thread's records follow each other without a gap and without a double.
  static void checkOrder(const StoredSession& session, std::array<std::uint64_t, kThreads>& last) {
    for (const auto& feedback : session.feedbacks) {
      auto& previous = last.at(static_cast<std::size_t>(feedback.queryId));
      ASSERT_EQ(feedback.clientQueryId, previous + 1) << "thread " << feedback.queryId;
      previous = feedback.clientQueryId;
    }
  }

  const TemporaryDirectory root_;
  Acknowledged* const acknowledged_;
  std::mt19937 random_{20261123};
  std::uniform_int_distribution<int> delay_{0, 60'000};
  std::uint64_t total_ = 0;
};

TEST_F(ContainerKillTest, LosesNothingThatWasAcknowledged) {
  for (int round = 0; round < kRounds && !HasFatalFailure(); ++round) {
    SCOPED_TRACE(round);
    recordAndKill();
    if (!HasFatalFailure()) readBack();
  }
  EXPECT_GT(total_, static_cast<std::uint64_t>(kRounds) * 100) << "too little was recorded";
}

}  // namespace
}  // namespace zelkord
