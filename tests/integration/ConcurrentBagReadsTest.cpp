// The bag controller and the user identifier on real queues, read from many threads at once.

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <thread>
#include <vector>

#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformOnQueues.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/BagRequests.h"
#include "zelkord/network/ZelkorBagController.h"
#include "zelkord/network/ZelkorUserGUIDController.h"

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

class ConcurrentBagReadsTest : public testing::Test {
 protected:
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
  const auto install = [this](int version) {
    bag_->cacheBagState(
        std::make_shared<const ZLKBag>(bag_->cacheBagDictionary({{"version", version}}), "agent"),
        BagOrigin::Network);
  };
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

}  // namespace
}  // namespace zelkord
