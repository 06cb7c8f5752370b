// Images of one host on real threads and connections, while another one never answers.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <condition_variable>
#include <functional>
#include <thread>

#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/url_sessions/CurlURLSessions.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformOnQueues.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestHTTPServer.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/core/EndpointConnection.h"
#include "zelkord/feedback/RecordingSessions.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/context/ZelkorUserGUIDController.h"
#include "zelkord/network/exchange/ImageFetcher.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"
#include "zelkord/query/ResponseImages.h"

namespace zelkord {
namespace {

// The end of a connection that nobody calls back.
class SilentConnection final : public ipc::Connection {
 public:
  explicit SilentConnection(pid_t pid) : pid_(pid) {}
  ipc::Peer peer() const override { return {.pid = pid_}; }
  void setHandler(std::shared_ptr<ipc::CallHandler>) override {}
  void setInvalidationHandler(std::function<void()>) override {}
  void invalidate() override {}
  void callClient(std::string_view, std::string_view, std::string_view, std::string_view,
                  ipc::Values, std::function<void(const Error&)>) override {}

 private:
  const pid_t pid_;
};

// One answer, waited for.
class AwaitedReply final : public ipc::Reply {
 public:
  void send(ipc::Values values) override { _set(values.at(0).get<ipc::DataMap>()->size()); }
  void fail(std::string_view, std::string_view) override { _set(std::nullopt); }

  // How many images came; none when the call was refused or not answered in time.
  std::optional<std::size_t> images(Duration limit) {
    const MutexLock lock(mutex_);
    const auto end = std::chrono::steady_clock::now() + limit;
    while (!answered_ && changed_.wait_until(mutex_, end) != std::cv_status::timeout) {
    }
    return images_;
  }

 private:
  void _set(std::optional<std::size_t> images) {
    const MutexLock lock(mutex_);
    answered_ = true;
    images_ = images;
    changed_.notify_all();
  }
  Mutex mutex_;
  std::condition_variable_any changed_;
  bool answered_ ZK_GUARDED_BY(mutex_) = false;
  std::optional<std::size_t> images_ ZK_GUARDED_BY(mutex_);
};

class StalledImageHostTest : public testing::Test {
 protected:
  StalledImageHostTest() {
    stalled_.reply("/image", TestHTTPReply::hanging());
    good_.reply("/image", TestHTTPReply::make(200, "bytes"));
    factory_->start();
    assembly_.requestFactory.set(factory_);
    bags_->start();
    assembly_.bagController.set(bags_);
    assembly_.guidController.set(std::make_shared<ZelkorUserGUIDController>(assembly_));
    assembly_.clientSessionManager.set(std::make_shared<RecordingSessionManager>("zelkor", true));
    assembly_.imageFetcher.set(std::make_shared<ImageFetcher>(assembly_));
    assembly_.responseImages.set(std::make_shared<ResponseImages>(assembly_));
    manager_ = std::make_shared<ClientStateManager>(assembly_);
    installBag();
  }

  void TearDown() override {
    for (const auto& connection : connections_) connection->invalidated();
    connections_.clear();
    // Releases run on the queues.
    for (int i = 0; i < 10'000 && isBusy(); ++i) std::this_thread::sleep_for(1ms);
  }
  bool isBusy() const {
    const auto workers = queues_.workers();
    return workers.running + workers.blocked > 0;
  }

  static bool eventually(const std::function<bool()>& condition) {
    for (int i = 0; i < 20'000 && !condition(); ++i) std::this_thread::sleep_for(1ms);
    return condition();
  }
  // Those under way included.
  std::ptrdiff_t imagesThatWait() {
    const auto open = transactions_.openNames();
    return std::ranges::count(open, "imageFetch");
  }
  void installBag() {
    bags_->cacheBagState(
        std::make_shared<const ZLKBag>(std::make_shared<const json::object>(json::object{
                                           {"search_url", good_.url("/s", "localhost")},
                                           {"__refresh_disabled", true},
                                           {"timeout_interval_for_request", 20}}),
                                       "daemon"),
        BagOrigin::Network);
    const json::value response = {{"icon", json::array{{{"url", stalled_.url("/")}},
                                                       {{"url", good_.url("/", "localhost")}}}}};
    assembly_.responseImages()->processImagesFromResponse(response, bags_->inMemoryBag().get());
  }
  std::shared_ptr<EndpointConnection> connect(pid_t pid) {
    connections_.push_back(std::make_shared<EndpointConnection>(assembly_, manager_, calls_));
    connections_.back()->start(std::make_shared<SilentConnection>(pid));
    return connections_.back();
  }
  // A call for that many images that nobody has asked for before.
  std::shared_ptr<AwaitedReply> ask(EndpointConnection& connection, const std::string& image,
                                    int count, std::uint64_t milliseconds) {
    std::vector<ipc::Dictionary> descriptors;
    for (int i = 0; i < count; ++i) {
      descriptors.push_back({{"url", image + "?" + std::to_string(asked_++)}});
    }
    auto reply = std::make_shared<AwaitedReply>();
    connection.handle({.interface = "com.quenta.zelkord.Endpoint1",
                       .member = "LoadImages",
                       .arguments = {std::move(descriptors), milliseconds},
                       .reply = reply});
    return reply;
  }

  TestHTTPServer stalled_;
  TestHTTPServer good_;
  TemporaryDirectory directory_;
  FakePlatform fakes_;
  RecordingLog log_;
  LinuxClock clock_;
  LinuxWorkQueues queues_{clock_};
  CurlURLSessions sessions_{
      queues_, {.cache = CurlURLSessions::Services::CacheHost{clock_, log_, directory_ / "cache"}}};
  CountedTransactions transactions_{clock_};
  LinuxFileManager files_{{directory_.path(), directory_.path(), directory_.path()}};
  Platform platform_ = onQueues(fakes_.platform(), clock_, queues_, sessions_, transactions_, &log_,
                                {&files_, nullptr});
  Assembly assembly_{platform_};
  const std::shared_ptr<ZLKNetworkRequestFactory> factory_ =
      std::make_shared<ZLKNetworkRequestFactory>(assembly_);
  const std::shared_ptr<ZelkorBagController> bags_ =
      std::make_shared<ZelkorBagController>(assembly_, *factory_);
  std::shared_ptr<ClientStateManager> manager_;
  const std::shared_ptr<Budget> calls_ =
      std::make_shared<Budget>("image_calls", Budget::quartered(1024), assembly_.limits());
  std::vector<std::shared_ptr<EndpointConnection>> connections_;
  int asked_ = 0;
};

TEST_F(StalledImageHostTest, HoldsUpNoOtherHost) {
  const auto attacker = connect(1);
  const auto honest = connect(2);
  // Half of them are given up soon, the others wait for their images.
  std::vector<std::shared_ptr<AwaitedReply>> waiting;
  for (int i = 0; i < 30; ++i) {
    waiting.push_back(ask(*attacker, stalled_.url("/image"), 1000, i % 2 == 0 ? 100 : 60'000));
  }
  for (int i = 0; i < 5; ++i) {
    const auto begin = clock_.realNow();
    EXPECT_EQ(ask(*honest, good_.url("/image", "localhost"), 20, 2'000)->images(10s), 20u);
    EXPECT_LT(clock_.realNow() - begin, 2s);
  }
  // Nor the calls of the same connection.
  EXPECT_TRUE(ask(*attacker, good_.url("/image", "localhost"), 1, 300)->images(2s));
  EXPECT_EQ(waiting.front()->images(10s), 0u);
  EXPECT_LE(stalled_.connections(), 16);
  // Its calls have asked for more than there are places for one process.
  EXPECT_TRUE(eventually(
      [this] { return fakes_.counters.all()["com.quenta.zelkord.limit.image_places"] > 0; }));
  EXPECT_LE(imagesThatWait(), 2'600);
}

TEST_F(StalledImageHostTest, LosesWhatNobodyWaitsFor) {
  const auto client = connect(1);
  for (int i = 0; i < 3; ++i) ask(*client, stalled_.url("/image"), 700, 300)->images(10s);
  constexpr auto kLeft = 16 + 64;  // under way, and what may still begin
  EXPECT_TRUE(eventually([this] { return imagesThatWait() <= kLeft; })) << imagesThatWait();
}

}  // namespace
}  // namespace zelkord
