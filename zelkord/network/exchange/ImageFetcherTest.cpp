#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>

#include "halvane/ModelFeedback.h"
#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/encoding/ErrorEncoding.h"
#include "zelkord/feedback/RecordingSessions.h"
#include "zelkord/network/context/ZelkorUserGUIDController.h"
#include "zelkord/network/exchange/ImageFetcher.h"

namespace zelkord {
namespace {

constexpr const char* kImageURL = "https://img.example/a.png?key=secret";

class ImageFetcherTest : public testing::Test {
 protected:
  using Image = ImageFetcher::Image;

  ImageFetcherTest() {
    assembly_.guidController.set(std::make_shared<ZelkorUserGUIDController>(assembly_));
    assembly_.clientSessionManager.set(sessions_);
    assembly_.imageFetcher.set(std::make_shared<ImageFetcher>(assembly_));
    assembly_.urlSession();
  }

  ZLKFuture<Image> fetch(const std::string& url = kImageURL) { return ask(url).image; }
  ImageFetcher::Ticket ask(const std::string& url, const std::string& holder = "pid 1") {
    return assembly_.imageFetcher()->fetchImageData(url, 7s, {}, holder);
  }
  void release(std::vector<ImageFetcher::Waiter> waiters) {
    assembly_.imageFetcher()->release(std::move(waiters));
    fakes_.timeline.runUntilIdle();
  }
  static std::string numbered(const std::string& host, std::size_t number) {
    return "https://" + host + "/" + std::to_string(number);
  }
  // How often a limit has refused something.
  std::int64_t refusals(const std::string& limit) {
    return fakes_.counters.all()["com.quenta.zelkord.limit." + limit];
  }
  FakeURLSession& session() { return *fakes_.urlSessions.find("urlSession"); }
  // Answers the one task that waits.
  void answer(const std::function<void(FakeURLTask&)>& reply) {
    ASSERT_EQ(session().pending().size(), 1u);
    reply(*session().pending().front());
    fakes_.timeline.runUntilIdle();
  }
  void answer(int status, const std::string& body) {
    answer([&](FakeURLTask& task) { task.succeed(status, body); });
  }
  template <typename Feedback>
  std::vector<std::shared_ptr<const Feedback>> recorded() const {
    std::vector<std::shared_ptr<const Feedback>> found;
    for (const auto& record : sessions_->records().all()) {
      auto feedback = std::dynamic_pointer_cast<const Feedback>(record.feedback);
      if (feedback) found.push_back(std::move(feedback));
    }
    return found;
  }

  FakePlatform fakes_;
  Assembly assembly_{fakes_.platform()};
  const std::shared_ptr<RecordingSessionManager> sessions_ =
      std::make_shared<RecordingSessionManager>("zelkor", true);
};

TEST_F(ImageFetcherTest, DownloadsOnceForAllWhoAskMeanwhile) {
  const auto first = fetch();
  const auto second = fetch();
  EXPECT_TRUE(fakes_.log.contains("pending https://img.example/a.png?<private>"));
  EXPECT_THAT(fakes_.transactions.openNames(), testing::ElementsAre("imageFetch"));
  EXPECT_TRUE(session().pending().at(0)->isDownload());
  answer(200, "bytes");
  EXPECT_EQ(first.get(), Data("bytes"));
  EXPECT_EQ(second.get(), Data("bytes"));
  EXPECT_TRUE(fakes_.transactions.openNames().empty());
  EXPECT_TRUE(fakes_.log.contains("caching 5 bytes for https://img.example/a.png?<private>"));

  const auto third = fetch();
  ASSERT_TRUE(third.isFulfilled());
  EXPECT_EQ(third.get(), Data("bytes"));
  EXPECT_EQ(session().tasks().size(), 1u);
  EXPECT_TRUE(fakes_.transactions.openNames().empty());
}

TEST_F(ImageFetcherTest, GivesTheOldFutureBetweenFulfilmentAndRemoval) {
  std::optional<ZLKFuture<Image>> between;
  fetch().then([&](const Image&) { between = fetch(); });
  answer(404, "");
  ASSERT_TRUE(between);
  EXPECT_TRUE(between->isFulfilled());
  EXPECT_EQ(session().tasks().size(), 1u);

  const auto later = fetch();
  EXPECT_FALSE(later.isFulfilled());
  answer(200, "better");
  EXPECT_EQ(later.get(), Data("better"));
}

TEST_F(ImageFetcherTest, AsksTheNetworkForHTTPAlone) {
  for (const auto* url :
       {"", "http", "data:image/png;base64,AA", "file:///http", "ht:tp", "://a"}) {
    SCOPED_TRACE(url);
    const auto image = fetch(url);
    ASSERT_TRUE(image.isFulfilled());
    EXPECT_EQ(image.get(), std::nullopt);
  }
  EXPECT_TRUE(session().tasks().empty());
  EXPECT_TRUE(sessions_->records().all().empty());
  EXPECT_FALSE(fetch("HTTPS://img.example/").isFulfilled());
  EXPECT_EQ(session().tasks().size(), 1u);
}

TEST_F(ImageFetcherTest, RecordsTheFetch) {
  fetch();
  answer([](FakeURLTask& task) {
    task.setTimingData({.domainLookup = 3});
    task.succeed(200, "bytes");
  });
  const auto start = recorded<HVStartNetworkSearchFeedback>().at(0);
  const auto agent = zelkordUserAgent(fakes_.device);
  EXPECT_EQ(start->url, kImageURL);
  EXPECT_EQ(start->headers, (StringMap{{"User-Agent", *agent}}));
  EXPECT_EQ(session().tasks().at(0)->request().headers, (HTTPHeaders{{"User-Agent", *agent}}));
  EXPECT_EQ(session().tasks().at(0)->request().timeout, 7s);
  EXPECT_EQ(start->triggerEvent.value, 15);
  EXPECT_EQ(start->endpointType.value, 7);
  const auto end = recorded<HVEndNetworkSearchFeedback>().at(0);
  EXPECT_EQ(start->uuid->size(), 36u);
  EXPECT_EQ(end->uuid, start->uuid);
  EXPECT_EQ(end->responseSize, 5);
  EXPECT_EQ(end->statusCode, 200);
  EXPECT_THAT(end->networkTimingData->text, testing::HasSubstr(R"("domain_lookup":3E0)"));
  for (const auto& record : sessions_->records().all()) EXPECT_EQ(record.userAgent, agent);
}

TEST_F(ImageFetcherTest, AnyFailureGivesNoneIsRecordedAndNotKept) {
  using Operation = FakeFileManager::Operation;
  const auto reply = [](int status, std::string body) {
    return [status, body](FakeURLTask& task) { task.succeed(status, body); };
  };
  struct Case {
    std::string log;
    std::function<void(FakeURLTask&)> reply;
    std::optional<Error> error;
    std::optional<Operation> failing;
  };
  const auto lost = urlError(URLErrorCode::ConnectionLost, "lost");
  const std::string shown = "https://img.example/a.png?<private>";
  const Case cases[] = {
      {"Error fetching image " + shown + ": " + lost.description(),
       [&](FakeURLTask& task) { task.fail(lost); },
       zelkorError(500, std::string("image fetch error ") + kImageURL)},
      {"Bad status code 404 for image " + shown, reply(404, "page"), std::nullopt},
      {"Bad status code 0 for image " + shown, [](FakeURLTask& task) { task.nonHTTP("x"); }, {}},
      {"opening file failed " + posixError(EMFILE).description(), reply(200, "x"),
       zelkorError(500, "file open failed"), Operation::Open},
      {"mmap failed " + posixError(ENOMEM).description(), reply(200, "x"), posixError(ENOMEM),
       Operation::Map},
      {"mmap failed " + posixError(EINVAL).description(), reply(200, ""), posixError(EINVAL)},
  };
  for (const auto& row : cases) {
    SCOPED_TRACE(row.log);
    fakes_.log.clear();
    if (row.failing)
      fakes_.files.fail(*row.failing, *row.failing == Operation::Open ? EMFILE : ENOMEM);
    const auto image = fetch();
    const auto errorsBefore = recorded<HVErrorFeedback>().size();
    answer(row.reply);
    if (row.failing) fakes_.files.fail(*row.failing, 0);
    ASSERT_TRUE(image.isFulfilled());
    EXPECT_EQ(image.get(), std::nullopt);
    EXPECT_EQ(fakes_.log.count(row.log), 1);
    const auto errors = recorded<HVErrorFeedback>();
    EXPECT_EQ(errors.size() - errorsBefore, row.error ? 1u : 0u);
    if (row.error) {
      EXPECT_EQ(errors.back()->error, errorRecordOf(*row.error));
    }
    EXPECT_EQ(recorded<HVEndNetworkSearchFeedback>().size(),
              recorded<HVStartNetworkSearchFeedback>().size());
    EXPECT_TRUE(fakes_.transactions.openNames().empty());
  }
  EXPECT_EQ(session().cache()->count(), 0u);
}

TEST_F(ImageFetcherTest, TakesOnlyAKeptImageFromTheCache) {
  session().cache()->store({.url = kImageURL}, {{kImageURL, 404, {}}, Data("not found")});
  EXPECT_FALSE(fetch().isFulfilled());
}

TEST_F(ImageFetcherTest, GoesThroughTheProxyWhenThatIsInUse) {
  struct Case {
    bool setting, enabled, fails;
    bool routed, proxied;
  };
  for (const auto& row : {Case{true, true, false, true, true},
                          {true, true, true, true, false},
                          {true, false, false, false, false},
                          {false, true, false, false, false}}) {
    SCOPED_TRACE(testing::Message() << row.setting << row.enabled << row.fails);
    fakes_.settings.set("ZLKUseMorvane", row.setting);
    fakes_.networkProxy.enabled = row.enabled;
    session().setProxyError(row.fails ? std::optional(zelkorError(1, "no proxy")) : std::nullopt);
    fakes_.log.clear();
    fetch();
    const auto task = session().pending().at(0);
    EXPECT_EQ(task->request().routed, row.routed);
    EXPECT_EQ(task->isProxyEnabled(), row.proxied);
    EXPECT_EQ(fakes_.log.contains("Enabling Morvane for #image request failed."), row.fails);
    answer(404, "");
  }
}

TEST_F(ImageFetcherTest, TakesFewConnectionsForManyImages) {
  std::vector<ZLKFuture<Image>> images;
  for (int i = 0; i < 40; ++i) images.push_back(fetch("https://img.example/" + std::to_string(i)));
  const auto other = fetch("https://other.example/");
  ASSERT_EQ(session().pending().size(), 17u);
  EXPECT_EQ(recorded<HVStartNetworkSearchFeedback>().size(), 17u);
  const auto first = session().pending().front();
  first->setTimingData({.protocol = "h2"});
  first->succeed(200, "bytes");
  fakes_.timeline.runUntilIdle();
  EXPECT_EQ(session().pending().size(), 33u);

  while (!session().pending().empty()) {
    session().pending().front()->succeed(200, "bytes");
    fakes_.timeline.runUntilIdle();
  }
  images.push_back(other);
  for (const auto& image : images) {
    ASSERT_TRUE(image.isFulfilled());
    EXPECT_EQ(image.get(), Data("bytes"));
  }
  EXPECT_EQ(session().tasks().size(), 41u);
}

TEST_F(ImageFetcherTest, NeitherAHostNorWhoAsksTakesAllPlaces) {
  constexpr auto kQuarter = ImageFetcher::kMostWaiting / 4;
  for (std::size_t i = 0; i < DownloadLine::kMostOfOneHost + kQuarter; ++i) {
    EXPECT_FALSE(ask(numbered("stalled.example", i)).image.isFulfilled());
  }
  EXPECT_EQ(ask(numbered("stalled.example", 1'000'000), "pid 2").image.get(), std::nullopt);
  EXPECT_EQ(refusals("image_places_of_host"), 1);
  EXPECT_EQ(ask(numbered("img.example", 1)).image.get(), std::nullopt);
  EXPECT_EQ(refusals("image_places"), 1);
  EXPECT_TRUE(fakes_.log.contains("stalled.example"));
  EXPECT_FALSE(ask(numbered("img.example", 1), "pid 2").image.isFulfilled());
  EXPECT_EQ(session().pending().back()->request().url, numbered("img.example", 1));

  session().pending().front()->succeed(404);
  fakes_.timeline.runUntilIdle();
  EXPECT_FALSE(ask(numbered("stalled.example", 1'000'000)).image.isFulfilled());
}

TEST_F(ImageFetcherTest, DropsWhatNobodyWaitsForAndHasNotBegun) {
  std::vector<ImageFetcher::Waiter> left;
  const auto first = ask(numbered("stalled.example", 0));
  for (std::size_t i = 1; i < 1000; ++i) left.push_back(ask(numbered("stalled.example", i)).waiter);
  const auto shared = ask(numbered("stalled.example", 999), "pid 2");
  const auto begun = session().tasks().size();
  release(std::move(left));
  EXPECT_EQ(fakes_.transactions.openNames().size(),
            begun + DownloadLine::kMostAbandonedOfOneHost + 1);
  EXPECT_FALSE(first.image.isFulfilled() || shared.image.isFulfilled());
  // Somebody waits for it: it begins before what is left.
  session().pending().front()->succeed(404);
  fakes_.timeline.runUntilIdle();
  EXPECT_EQ(session().tasks().back()->request().url, numbered("stalled.example", 999));
  // Dropped and wanted once more it waits anew.
  EXPECT_FALSE(ask(numbered("stalled.example", 100)).image.isFulfilled());
  while (!session().pending().empty()) {
    session().pending().front()->succeed(404);
    fakes_.timeline.runUntilIdle();
  }
  EXPECT_EQ(session().tasks().size(), begun + DownloadLine::kMostAbandonedOfOneHost + 2);
  EXPECT_TRUE(fakes_.transactions.openNames().empty());
}

TEST_F(ImageFetcherTest, WhatNobodyWaitsForHasTheTimeOutToEnd) {
  const auto slow = ask(kImageURL);
  const auto wantedAgain = ask(numbered("img.example", 1));
  release({slow.waiter, wantedAgain.waiter, slow.waiter});
  fakes_.timeline.advance(4s);
  release({ask(kImageURL).waiter});  // gives it no more time
  fakes_.timeline.advance(2s);
  EXPECT_FALSE(ask(numbered("img.example", 1)).image.isFulfilled());
  EXPECT_EQ(session().pending().size(), 2u);
  fakes_.timeline.advance(1s);
  EXPECT_EQ(session().pending().size(), 1u);
  EXPECT_EQ(slow.image.get(), std::nullopt);
  fakes_.timeline.advance(60s);
  answer(200, "bytes");
  EXPECT_EQ(wantedAgain.image.get(), Data("bytes"));
}

TEST_F(ImageFetcherTest, HoldsNothingOfThoseWhoWaitNoMore) {
  const auto stays = ask(kImageURL);
  const auto held = std::make_shared<int>();
  std::vector<Image> reactions;
  const auto react = [&reactions, held](const Image& image) { reactions.push_back(image); };
  assembly_.imageFetcher()->await(stays, react);
  const auto once = held.use_count();
  for (int i = 0; i < 100; ++i) {
    const auto leaves = ask(kImageURL);
    assembly_.imageFetcher()->await(leaves, react);
    release({leaves.waiter});
    assembly_.imageFetcher()->await(leaves, react);  // too late
  }
  EXPECT_EQ(held.use_count(), once);
  answer(200, "bytes");
  assembly_.imageFetcher()->await(stays, react);
  fakes_.timeline.runUntilIdle();
  EXPECT_THAT(reactions, testing::ElementsAre(Data("bytes"), Data("bytes")));
}

TEST_F(ImageFetcherTest, WhatIsCancelledIsSharedWithNobody) {
  const auto slow = ask(kImageURL);
  release({slow.waiter});
  std::optional<ZLKFuture<Image>> late;
  slow.image.then([&](const Image&) { late = fetch(); });  // not known to have ended yet
  fakes_.timeline.advance(7s);
  ASSERT_TRUE(late);
  answer(200, "bytes");
  EXPECT_EQ(late->get(), Data("bytes"));
  EXPECT_TRUE(fakes_.transactions.openNames().empty());
}

TEST_F(ImageFetcherTest, LeavesNobodyWaitingWhenItIsGone) {
  const auto image = fetch();
  const auto waiting = [this] {
    for (std::size_t i = 1; i < DownloadLine::kMostOfOneHost; ++i) {
      fetch("https://img.example/" + std::to_string(i));
    }
    return fetch("https://img.example/last");
  }();
  assembly_.imageFetcher.set(nullptr);
  ASSERT_TRUE(waiting.isFulfilled());
  EXPECT_EQ(waiting.get(), std::nullopt);
  for (const auto& task : session().pending()) task->succeed(200, "bytes");
  fakes_.timeline.runUntilIdle();
  ASSERT_TRUE(image.isFulfilled());
  EXPECT_EQ(image.get(), std::nullopt);
  EXPECT_TRUE(fakes_.transactions.openNames().empty());
}

}  // namespace
}  // namespace zelkord
