// The bag controller, whoever follows its bag, and the user identifier on real queues, used from
// many threads at once.

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <functional>
#include <thread>
#include <utility>
#include <vector>

#include "base/CondVar.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformOnQueues.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/core/BagTeller.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/feedback/RecordingSessions.h"
#include "zelkord/network/bag/BagRequests.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/context/ZelkorUserGUIDController.h"

namespace zelkord {
namespace {

constexpr int kReaders = 8;

class CountingBagRequests final : public BagRequests {
 public:
  URLRequest bagFetchRequest(const ZelkorBagController&, const std::optional<std::string>&,
                             const std::optional<std::string>&) override {
    return {.url = "https://host/bag"};
  }
  URLRequest bagCacheRequest(const ZelkorBagController&, const std::optional<std::string>&,
                             const std::optional<std::string>&) override {
    return {.url = "https://host/bag?cc=DE"};
  }
  std::uint64_t contextGeneration() const override { return generation.load(); }

  std::atomic<std::uint64_t> generation = 0;
};

// A client that writes down the versions that it is told; 0: no bag.
class ToldClient final : public ipc::Connection {
 public:
  ipc::Peer peer() const override { return {}; }
  void setHandler(std::shared_ptr<ipc::CallHandler>) override {}
  void setInvalidationHandler(std::function<void()>) override {}
  void invalidate() override {}
  void callClient(std::string_view, std::string_view, std::string_view, std::string_view,
                  ipc::Values values, std::function<void(const Error&)>) override {
    const auto& bag = *values.at(0).get<ipc::Dictionary>();
    const auto version = bag.find("version");
    const MutexLock lock(mutex_);
    versions_.push_back(version == bag.end() ? 0 : std::stoi(*version->second.get<std::string>()));
    told_.notifyAll();
  }

  void waitFor(int version) {
    const auto deadline = waitDeadline(60s);
    const MutexLock lock(mutex_);
    while (std::ranges::find(versions_, version) == versions_.end()) {
      if (!told_.waitUntil(mutex_, deadline)) break;
    }
  }
  std::vector<int> versions() {
    const MutexLock lock(mutex_);
    return versions_;
  }

 private:
  Mutex mutex_;
  CondVar told_;
  std::vector<int> versions_ ZK_GUARDED_BY(mutex_);
};

class ConcurrentBagReadsTest : public testing::Test {
 protected:
  void install(int version) {
    bag_->cacheBagState(
        std::make_shared<const ZLKBag>(bag_->cacheBagDictionary({{"version", version}}), "agent"),
        BagOrigin::Network);
  }
  static void onManyThreads(const std::function<void()>& work) {
    std::vector<std::thread> threads;
    for (int i = 0; i < kReaders; ++i) threads.emplace_back(work);
    for (auto& thread : threads) thread.join();
  }

  FakePlatform fakes_;
  LinuxClock clock_;
  LinuxWorkQueues queues_{clock_};
  FakeURLSessions sessions_{queues_};
  CountedTransactions transactions_{clock_};
  Platform platform_ = onQueues(fakes_.platform(), clock_, queues_, sessions_, transactions_);
  Assembly assembly_{platform_};
  CountingBagRequests requests_;
  std::shared_ptr<ZelkorBagController> bag_ =
      std::make_shared<ZelkorBagController>(assembly_, requests_);
  ZelkorUserGUIDController guids_{assembly_};
};

TEST_F(ConcurrentBagReadsTest, ReadersWithoutABagBeginOneFetch) {
  onManyThreads([this] { EXPECT_EQ(bag_->currentBag(), nullptr); });
  EXPECT_EQ(sessions_.find("bagSession")->tasks().size(), 1u);
}

TEST_F(ConcurrentBagReadsTest, ReadersSeeWholeBagsWhileOthersInstall) {
  install(1);
  std::atomic<int> next = 2;
  onManyThreads([&] {
    for (int i = 0; i < 200; ++i) {
      const auto bag = bag_->currentBag();
      ASSERT_TRUE(bag && bag->version());
      ASSERT_EQ(bag_->inMemoryBag()->userAgent(), "agent");
      if (i % 20 == 0) install(next++);
      if (i % 10 == 0) ++requests_.generation;
      if (i % 50 == 0) guids_.reset();
      ASSERT_NE(guids_.currentUserGUID(), UUID());
    }
  });
  EXPECT_EQ(sessions_.find("bagSession"), nullptr);  // none of them was due
}

TEST_F(ConcurrentBagReadsTest, WhoObservesMeanwhileHearsThePresentAndEveryChangeOnceInOrder) {
  struct Observation {
    std::vector<BagPointer> heard;
    Subscription subscription;
  };
  const auto begin = [this](Observation& observation) {
    observation.subscription = assembly_.installedBag().observe(
        [&observation](BagNews, const BagPointer& bag) { observation.heard.push_back(bag); });
  };
  Observation all;
  begin(all);
  std::array<Observation, 80> late;
  std::atomic<int> next = 0;
  onManyThreads([&] {
    for (int i = 0; i < 100; ++i) {
      const int number = next++;
      install(number);
      if (number % 10 == 9) begin(late.at(static_cast<std::size_t>(number) / 10));
    }
  });
  ASSERT_EQ(all.heard.size(), 801u);
  for (const auto& observation : late) {
    const auto& heard = observation.heard;
    ASSERT_FALSE(heard.empty());
    ASSERT_LE(heard.size(), all.heard.size());
    EXPECT_TRUE(std::equal(heard.rbegin(), heard.rend(), all.heard.rbegin()));
  }
}

TEST_F(ConcurrentBagReadsTest, AClientThatConfiguresItselfDuringChangesIsNeverToldAnOlderBag) {
  constexpr int kChanges = 500;
  assembly_.feedbackSessions.set(std::make_shared<RecordingSessions>(true));
  assembly_.bagController.set(bag_);
  assembly_.clientStateManager.set(std::make_shared<ClientStateManager>(assembly_));
  const auto state = std::make_shared<ClientState>("lanthe", assembly_);
  const auto client = std::make_shared<ToldClient>();
  auto teller = std::make_shared<BagTeller>(assembly_, client);
  install(1);
  std::thread installer([this] {
    for (int version = 2; version <= kChanges; ++version) install(version);
  });
  std::thread configurer([&] {
    for (int i = 0; i < kChanges; ++i) teller->clientConfigured(state, "Lanthe/9");
  });
  installer.join();
  configurer.join();
  client->waitFor(kChanges);
  for (const std::weak_ptr<BagTeller> busy = std::exchange(teller, nullptr); !busy.expired();) {
    std::this_thread::yield();
  }
  const auto versions = client->versions();
  EXPECT_TRUE(std::ranges::is_sorted(versions));
  ASSERT_FALSE(versions.empty());
  EXPECT_EQ(versions.back(), kChanges);
}

}  // namespace
}  // namespace zelkord
