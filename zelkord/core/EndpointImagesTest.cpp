#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <limits>

#include "corezelkor/Constants.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/core/DaemonTestSupport.h"
#include "zelkord/core/Wire.h"

namespace zelkord {
namespace {

class EndpointImagesTest : public testing::Test {
 protected:
  EndpointImagesTest() { bed_.installBag(kServedBag); }

  DaemonBed::Client connect() {
    auto client =
        bed_.fakes.interprocess.connect(bed_.daemon.assembly().clientStateManager()->endpoint());
    bed_.run();
    return client;
  }
  // The call is on its way when this returns.
  static DaemonBed::Answer ask(const DaemonBed::Client& client,
                               std::vector<ipc::Dictionary> descriptors,
                               std::uint64_t milliseconds) {
    return client->call(std::string(kEndpointInterface), "LoadImages",
                        {std::move(descriptors), milliseconds});
  }
  static ipc::Dictionary image(const std::string& name) {
    return {{"url", "https://s.example/" + name}};
  }
  static std::vector<std::string> keysIn(const ipc::FakeAnswer& answer) {
    std::vector<std::string> keys;
    for (const auto& [key, bytes] : *answer.values.at(0).get<ipc::DataMap>()) keys.push_back(key);
    return keys;
  }
  std::size_t downloads() {
    return static_cast<std::size_t>(std::ranges::count_if(
        bed_.urlSession().tasks(), [](const auto& task) { return task->isDownload(); }));
  }

  DaemonBed bed_;
};

TEST_F(EndpointImagesTest, RefusesWhatBreaksItsRules) {
  const struct {
    std::vector<ipc::Dictionary> descriptors;
    std::string errorName;
  } cases[] = {
      {{}, ""},
      {{{{"url", ""}, {"id", "no such"}, {"data", Data("x")}, {"more", true}}}, ""},
      {{{{"url", std::int64_t{7}}}}, std::string(ipc::kInvalidArgs)},
      {{{{"id", Data("x")}}}, std::string(ipc::kInvalidArgs)},
      {{image("a"), {{"data", "text"}}}, std::string(ipc::kInvalidArgs)},
      {std::vector<ipc::Dictionary>(1000), ""},
      {std::vector<ipc::Dictionary>(1001), std::string(ipc::kLimitsExceeded)},
  };
  const auto client = connect();
  for (const auto& [descriptors, errorName] : cases) {
    const auto answer = ask(client, descriptors, 1000);
    bed_.run();
    EXPECT_TRUE(answer->answered);
    EXPECT_EQ(answer->errorName, errorName);
    if (errorName.empty()) {
      EXPECT_THAT(keysIn(*answer), testing::IsEmpty());
    }
  }
  EXPECT_EQ(downloads(), 0u);
  EXPECT_TRUE(bed_.fakes.log.contains("endpoint LoadImages refused: more than 1000 descriptors"));
}

TEST_F(EndpointImagesTest, EachCallCountsItsOwnTimeFromReceipt) {
  const auto client = connect();
  const auto other = connect();
  auto& timeline = bed_.fakes.timeline;
  ask(client, {image("kept")}, 100);
  bed_.run();
  bed_.urlSession().pending().at(0)->succeed(200, "bytes");
  bed_.run();
  const std::vector<std::vector<std::uint64_t>> orders = {{300, 3000}, {3000, 300}};
  for (const auto& order : orders) {
    SCOPED_TRACE(order.front());
    const auto begin = timeline.now();
    const auto slow = ask(client, {image("slow")}, order.front());
    const auto second = ask(client, {image("slower"), image("kept")}, order.back());
    const auto kept = ask(client, {image("kept")}, 300);
    const auto elsewhere = ask(other, {}, 300);
    const auto query = client->call(std::string(kEndpointInterface), "Request",
                                    {"card", ipc::Dictionary{}, ipc::Dictionary{}});
    bed_.run();
    for (const auto& answer : {kept, elsewhere, query}) EXPECT_TRUE(answer->answered);
    EXPECT_THAT(keysIn(*kept), testing::ElementsAre("https://s.example/kept"));
    const auto& shorter = order.front() < order.back() ? slow : second;
    const auto& longer = order.front() < order.back() ? second : slow;
    ASSERT_TRUE(timeline.runUntil([&] { return shorter->answered; }));
    EXPECT_EQ(timeline.now() - begin, 300ms);
    ASSERT_TRUE(timeline.runUntil([&] { return longer->answered; }));
    EXPECT_EQ(timeline.now() - begin, 3s);
    EXPECT_THAT(keysIn(*second), testing::ElementsAre("https://s.example/kept"));
  }
}

TEST_F(EndpointImagesTest, ALookUpThatTakesItsTimeDelaysNoDeadline) {
  const auto client = connect();
  auto& timeline = bed_.fakes.timeline;
  const auto never = timeline.makeSemaphore(0);
  bed_.urlSession().cache()->setOnLookup([&never] { never->wait(2s); });
  const auto first = ask(client, {image("a")}, 300);
  const auto second = ask(client, {image("b")}, 500);
  std::vector<bool> answered;
  std::vector<Subscription> looks;
  for (const auto moment : {299ms, 301ms, 499ms, 501ms}) {
    looks.push_back(timeline.global(QualityOfService::Default).after(moment, [&] {
      answered.push_back(answered.size() < 2 ? first->answered : second->answered);
    }));
  }
  timeline.advance(5s);
  EXPECT_THAT(answered, testing::ElementsAre(false, true, false, true));
}

TEST_F(EndpointImagesTest, RefusesWhatAProcessAsksBeyondItsShare) {
  const auto client = connect();
  std::vector<DaemonBed::Answer> waiting;
  for (int i = 0; i < 256; ++i) waiting.push_back(ask(client, {image("slow")}, 60'000));
  const auto refused = ask(client, {image("slow")}, 60'000);
  bed_.run();
  EXPECT_EQ(refused->errorName, ipc::kLimitsExceeded);
  EXPECT_EQ(bed_.fakes.counters.all()["com.quenta.zelkord.limit.image_calls"], 1);
  EXPECT_EQ(downloads(), 1u);
  bed_.urlSession().pending().at(0)->succeed(200, "bytes");
  bed_.run();
  for (const auto& answer : waiting) ASSERT_TRUE(answer->succeeded());
  const auto next = ask(client, {image("slow")}, 60'000);
  bed_.run();
  EXPECT_TRUE(next->succeeded());
}

TEST_F(EndpointImagesTest, EndsWithTheLastImageHoweverLongItMayWait) {
  const auto client = connect();
  auto& timeline = bed_.fakes.timeline;
  constexpr auto kMaximum = std::numeric_limits<std::uint64_t>::max();
  for (const auto limit : {std::uint64_t{400'000}, kMaximum / 2 + 1, kMaximum}) {
    SCOPED_TRACE(limit);
    const auto answer = ask(client, {image(std::to_string(limit))}, limit);
    const auto arrival = timeline.global(QualityOfService::Default).after(300s, [&] {
      bed_.urlSession().pending().at(0)->succeed(200, "bytes");
    });
    const auto begin = timeline.now();
    ASSERT_TRUE(timeline.runUntil([&] { return answer->answered; }));
    EXPECT_EQ(timeline.now() - begin, 300s);
    EXPECT_THAT(keysIn(*answer),
                testing::ElementsAre("https://s.example/" + std::to_string(limit)));
    EXPECT_EQ(client->state(), ipc::FakeClient::State::Open);
  }
}

TEST_F(EndpointImagesTest, GivesTheCallsUpWhenTheClientGoes) {
  const auto client = connect();
  std::vector<ipc::Dictionary> many;
  for (int i = 0; i < 1000; ++i) many.push_back(image(std::to_string(i)));
  ask(client, many, 400'000);
  ask(client, {image("b")}, 400'000);
  bed_.run();
  const auto begun = downloads();
  client->disconnect();
  // What is under way has its time-out to end; nothing begins after it.
  bed_.fakes.timeline.advance(30s);
  EXPECT_TRUE(bed_.urlSession().pending().empty());
  EXPECT_EQ(downloads(), begun);
  EXPECT_THAT(bed_.fakes.transactions.openNames(), testing::Not(testing::Contains("imageFetch")));
  const auto next = connect();
  const auto answer = ask(next, {image("c")}, 1000);
  bed_.run();
  bed_.urlSession().pending().at(0)->succeed(200, "bytes");
  bed_.run();
  EXPECT_TRUE(answer->succeeded());
}

TEST(EncodedImagesTest, AreAsManyAsFitIntoOneArray) {
  const auto total = [](const ipc::DataMap& images) {
    std::size_t size = 0;
    for (const auto& [key, bytes] : images) size += 4 + key.size() + 1 + 3 + 4 + bytes.size() + 7;
    return size;
  };
  const Data large(std::string(8u << 20, 'x'));
  LoadedImages images;
  for (int i = 0; i < 8; ++i) images.emplace_back(std::to_string(i), large);
  images.emplace_back("small", Data("x"));
  const auto encoded = encodeImages(images);
  ASSERT_EQ(encoded.size(), 7u);
  EXPECT_EQ(encoded.back().first, "6");
  EXPECT_LE(total(encoded), 64u << 20);
  images.erase(images.begin());
  EXPECT_EQ(encodeImages(images).size(), 8u);
}

}  // namespace
}  // namespace zelkord
