#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>

#include "corezelkor/Constants.h"
#include "halvane/ModelFeedback.h"
#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/network/bag/BagRequests.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/context/ZelkorUserGUIDController.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class FakeBagRequests final : public BagRequests {
 public:
  std::string country = "DE";
  std::uint64_t generation = 1;
  int cacheRequests = 0;

  URLRequest bagFetchRequest(const ZelkorBagController& controller,
                             const std::optional<std::string>& userAgent,
                             const std::optional<std::string>& version) override {
    return {.url = controller.bagFetchURLWithCountry(country) + "?v=" + version.value_or("none"),
            .headers = {{"User-Agent", userAgent.value_or("")}}};
  }
  URLRequest bagCacheRequest(const ZelkorBagController& controller,
                             const std::optional<std::string>& userAgent,
                             const std::optional<std::string>&) override {
    ++cacheRequests;
    return {.url = controller.bagFetchURLWithCountry(country) + "?cc=" + country +
                   "&agent=" + std::to_string(userAgent.value_or("").size())};
  }
  std::uint64_t contextGeneration() const override { return generation; }
};

// Writes down what the sessions of fetches get.
class FetchSessions final : public FeedbackSessions {
 public:
  std::vector<std::string> events;
  std::vector<ZelkorFeedback> records;

  std::shared_ptr<SessionManager> makeManager(std::string,
                                              std::shared_ptr<UserGUIDSource>) override {
    return nullptr;
  }
  std::shared_ptr<FeedbackSession> makeSession(ZelkorFeedback first) override {
    _note(std::move(first));
    return std::make_shared<Session>(*this);
  }

 private:
  class Session final : public FeedbackSession {
   public:
    explicit Session(FetchSessions& owner) : owner_(owner) {}
    void addFeedback(ZelkorFeedback feedback) override { owner_._note(std::move(feedback)); }
    void sessionComplete() override { owner_.events.emplace_back("complete"); }

   private:
    FetchSessions& owner_;
  };

  void _note(ZelkorFeedback record) {
    events.emplace_back(record.feedback->className());
    records.push_back(std::move(record));
  }
};

class ZelkorBagControllerTest : public testing::Test {
 protected:
  void make() {
    controller_ = std::make_shared<ZelkorBagController>(assembly_, requests_);
    controller_->start();
    platform_.timeline.runUntilIdle();
  }

  FakeURLSession& session() {
    assembly_.bagSession();
    return *platform_.urlSessions.find("bagSession");
  }
  std::size_t fetchesUnderWay() { return session().pending().size(); }
  void reply(int status, std::string body) {
    ASSERT_EQ(fetchesUnderWay(), 1u);
    session().pending()[0]->succeed(status, std::move(body));
    platform_.timeline.runUntilIdle();
  }
  // Has the given bag fetched and installed, whatever is there.
  void install(std::string body) {
    if (fetchesUnderWay() == 0) controller_->forceFetchBag({{"bag", 1e6}});
    reply(200, std::move(body));
  }
  // Reads as a client does, and lets the fetch begin that this may ask for.
  std::string readVersion() {
    const auto bag = controller_->currentBag();
    platform_.timeline.runUntilIdle();
    return bag ? bag->version().value_or("") : "no bag";
  }
  void putOnDisk(double secondsLeft, std::string version) {
    const json::object bag{
        {"version", std::move(version)},
        {"__expiration", secondsSince1970(platform_.timeline.wallNow()) + secondsLeft},
        {"__bagurl", cacheURL()}};
    platform_.files.put(kPath, *platform_.propertyLists.encode(bag, nullptr));
  }
  std::string cacheURL() {
    const ZelkorBagController asker(assembly_, requests_);
    return requests_.bagCacheRequest(asker, kUserAgent, std::nullopt).url;
  }
  std::int64_t counted(const std::string& name) const {
    return platform_.counters.value("com.quenta.zelkord.bag." + name);
  }

  static constexpr const char* kPath = "/caches/bag.plist";
  static constexpr const char* kUserAgent = "Zelkord/1.0 (Phone1,1; TestOS 1A234) Zelkord/1.0";

  FakePlatform platform_;
  Assembly assembly_{platform_.platform()};
  FakeBagRequests requests_;
  std::vector<std::string> notified_;  // a version, or an error's reason
  Subscription observer_ = platform_.notificationCenter.observe(
      std::string(kZLKBagChangeNotification), [this](const Notification& notification) {
        if (const auto* bag = notification.value<BagPointer>("bag")) {
          notified_.push_back((*bag)->version().value_or("no version"));
        }
        if (const auto* error = notification.value<Error>("bagError")) {
          notified_.push_back(error->reason().value_or(std::to_string(error->code)));
        }
      });
  std::shared_ptr<ZelkorBagController> controller_;
};

TEST_F(ZelkorBagControllerTest, TheFirstReadsFetchOnceAndTheAnswerIsKept) {
  make();
  EXPECT_EQ(readVersion(), "no bag");
  EXPECT_EQ(readVersion(), "no bag");
  EXPECT_EQ(controller_->warmURL(), std::nullopt);
  EXPECT_THAT(platform_.transactions.openNames(), ElementsAre("bagFetch"));
  reply(200, R"({"version": "7", "warm_url": "https://h/w", "x": [null, 1], "y": null})");

  EXPECT_EQ(session().tasks().size(), 1u);
  EXPECT_EQ(session().tasks()[0]->request().url, "https://api.zelkor.example/bag?v=none");
  EXPECT_EQ(session().tasks()[0]->request().header("User-Agent"), kUserAgent);
  EXPECT_EQ(readVersion(), "7");
  EXPECT_EQ(controller_->warmURL(), "https://h/w");
  EXPECT_EQ(controller_->inMemoryBag()->userAgent(), kUserAgent);
  EXPECT_TRUE(controller_->inMemoryBag()->rawBag()->at("y").is_null());
  EXPECT_THAT(notified_, ElementsAre("7"));
  EXPECT_EQ(counted("fetches"), 1);
  EXPECT_THAT(platform_.transactions.openNames(), IsEmpty());

  EXPECT_EQ(platform_.files.mode(kPath), 0600u);
  const auto stored =
      platform_.propertyLists.decode(*platform_.files.bytes(kPath), nullptr)->as_object();
  EXPECT_EQ(stored.at("x"), json::array{1});
  EXPECT_FALSE(stored.contains("y"));
  EXPECT_EQ(numberIn(stored, "__expiration"),
            secondsSince1970(platform_.timeline.wallNow()) + 14400);
  EXPECT_EQ(stringIn(stored, "__bagurl"), cacheURL());
}

TEST_F(ZelkorBagControllerTest, ReadsFetchAnewTenMinutesBeforeTheEnd) {
  make();
  readVersion();
  install(R"({"version": 1})");
  platform_.timeline.advance(13800s);
  EXPECT_EQ(readVersion(), "1");
  EXPECT_EQ(fetchesUnderWay(), 0u);
  platform_.timeline.advance(1s);
  EXPECT_EQ(readVersion(), "1");
  EXPECT_EQ(readVersion(), "1");
  EXPECT_EQ(fetchesUnderWay(), 1u);
  EXPECT_EQ(counted("expired"), 2);
  EXPECT_TRUE(platform_.log.contains("bag expired: 599.000000"));
  install(R"({"version": 2, "__refresh_disabled": 0})");
  EXPECT_FALSE(controller_->inMemoryBag()->rawBag()->contains("__refresh_disabled"));
  platform_.timeline.advance(24h);
  EXPECT_EQ(readVersion(), "2");
  EXPECT_EQ(fetchesUnderWay(), 1u) << "the service has no say in that";
}

TEST_F(ZelkorBagControllerTest, AFetchWhoseURLChangesMeanwhileIsFollowedByAnother) {
  const auto move = [this](std::string country) {
    requests_.country = std::move(country);
    ++requests_.generation;
    platform_.notificationCenter.post({std::string(kZLKBagRefreshRequired), &requests_, {}});
    platform_.timeline.runUntilIdle();
  };
  make();
  readVersion();
  move("CN");
  EXPECT_EQ(session().tasks().size(), 1u) << "one at a time";
  reply(200, R"({"version": "global"})");
  ASSERT_EQ(fetchesUnderWay(), 1u);
  EXPECT_EQ(session().pending()[0]->request().url, "https://api-cn.zelkor.example/bag?v=none");
  reply(200, R"({"version": "chinese"})");
  EXPECT_EQ(readVersion(), "chinese");
  EXPECT_EQ(fetchesUnderWay(), 0u);

  // When that one fails, the bag of the other country does not pass for this one's, nor does it
  // after a restart.
  move("DE");
  move("CN");
  reply(200, R"({"version": "global"})");
  reply(500, "");
  EXPECT_EQ(fetchesUnderWay(), 0u);
  EXPECT_EQ((*platform_.propertyLists.decode(*platform_.files.bytes(kPath), nullptr))
                .as_object()
                .at("version"),
            "chinese");
  EXPECT_EQ(readVersion(), "global");
  reply(200, R"({"version": "chinese"})");
  EXPECT_EQ(readVersion(), "chinese");
  EXPECT_EQ(fetchesUnderWay(), 0u);

  move("DE");
  move("CN");
  move("DE");
  reply(500, "");
  EXPECT_EQ(fetchesUnderWay(), 0u) << "there and back";
}

TEST_F(ZelkorBagControllerTest, TellsPeopleHowFetchingGoes) {
  const auto& timeline = platform_.timeline;
  platform_.settings.set("ZLKBagURL", "https://me:secret@h:8443/bag?token=1#x");
  make();
  EXPECT_EQ(controller_->fetchStatus().url, "https://h:8443/bag");
  EXPECT_FALSE(controller_->fetchStatus().lastFailure);
  EXPECT_EQ(controller_->fetchStatus().nextAttempt, timeline.wallNow());

  readVersion();
  session().pending().at(0)->fail(urlError(URLErrorCode::HostNotFound));
  platform_.timeline.runUntilIdle();
  const auto failedAt = timeline.wallNow();
  platform_.timeline.advance(5s);
  const auto status = controller_->fetchStatus();
  ASSERT_TRUE(status.lastFailure);
  EXPECT_EQ(status.lastFailure->reason, "name does not resolve");
  EXPECT_EQ(status.lastFailure->time, failedAt);
  EXPECT_EQ(status.nextAttempt, timeline.wallNow()) << "the next read";

  readVersion();
  reply(200, "{}");
  EXPECT_EQ(controller_->fetchStatus().nextAttempt, timeline.wallNow() + 13800s);
  platform_.timeline.advance(14000s);
  EXPECT_EQ(controller_->fetchStatus().nextAttempt, timeline.wallNow());
  EXPECT_EQ(counted("expired"), 0) << "asking is no read";
  controller_->cacheBagState(
      std::make_shared<const ZLKBag>(
          std::make_shared<const json::object>(json::object{{"__refresh_disabled", 0}}),
          std::nullopt),
      BagOrigin::Network);
  EXPECT_EQ(controller_->fetchStatus().nextAttempt, std::nullopt);
}

TEST_F(ZelkorBagControllerTest, ReadsFetchAnewWhenTheURLChanges) {
  make();
  readVersion();
  install(R"({"version": 1})");
  for (int i = 0; i < 3; ++i) readVersion();
  EXPECT_EQ(requests_.cacheRequests, 1);  // remembered while nothing changes
  ++requests_.generation;
  readVersion();
  EXPECT_EQ(fetchesUnderWay(), 0u);

  requests_.country = "CN";
  ++requests_.generation;
  readVersion();
  EXPECT_TRUE(
      platform_.log.contains("bag url changed from: https://api.zelkor.example/bag?<private> to "
                             "https://api-cn.zelkor.example/bag?<private>"));
  install(R"({"version": 2})");
  readVersion();
  EXPECT_EQ(fetchesUnderWay(), 0u);

  platform_.settings.set("ZLKBagURL", "https://elsewhere/bag");
  readVersion();
  EXPECT_EQ(session().pending().at(0)->request().url, "https://elsewhere/bag?v=none");
}

TEST_F(ZelkorBagControllerTest, AFailedFetchLeavesTheBagAndMayBeRepeated) {
  make();
  readVersion();
  install(R"({"version": "old"})");
  const auto file = platform_.files.bytes(kPath);
  platform_.settings.set("ZLKMaximumBagSize", 64);
  struct Case {
    std::string_view name;
    int status;  // 0: the connection is lost
    std::string body;
    std::string_view posted;
  };
  const Case cases[] = {
      {"server error", 500, "{}", "statusCode 500"},
      {"not modified", 304, "", "statusCode 304"},
      {"not JSON", 200, "<html>", "not JSON object"},
      {"array", 200, "[]", "not JSON object"},
      {"too large", 200, "{\"a\": \"" + std::string(60, 'x') + "\"}", "-1103"},
      {"connection lost", 0, "", "-1005"},
  };
  platform_.timeline.advance(14000s);
  for (const auto& test : cases) {
    SCOPED_TRACE(test.name);
    notified_.clear();
    readVersion();
    if (test.status == 0) {
      session().pending().at(0)->fail(urlError(URLErrorCode::ConnectionLost));
      platform_.timeline.advance(10s);
    } else {
      reply(test.status, test.body);
    }
    EXPECT_THAT(notified_, ElementsAre(test.posted));
    EXPECT_EQ(controller_->inMemoryBag()->version(), "old");
    EXPECT_EQ(platform_.files.bytes(kPath), file);
    EXPECT_EQ(fetchesUnderWay(), 0u);
  }
  EXPECT_EQ(counted("fetchesfailed"), static_cast<std::int64_t>(std::size(cases)));
  EXPECT_EQ(counted("fetches"), 1);
}

TEST_F(ZelkorBagControllerTest, AReportedVersionIsFetchedOnlyWhenItIsNewer) {
  make();
  struct Case {
    json::value installed;
    json::object reported;
    std::string_view fetched;  // empty: nothing
  };
  const Case cases[] = {
      {"9", {{"bag", 10}}, "10"},   {9, {{"bag", 9}}, ""},        {"9", {{"bag", 8}}, ""},
      {"10", {{"bag", 9}}, ""},     {"9", {{"bag", 9.5}}, "9.5"}, {"9", {{"bag", 10.0}}, "10"},
      {nullptr, {{"bag", 1}}, "1"}, {"9", {{"bag", "10"}}, ""},   {"9", {{"bag", nullptr}}, ""},
      {"9", {{"version", 10}}, ""}, {"1.9", {{"bag", 2}}, "2"},   {"2.1", {{"bag", 2}}, ""},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(json::serialize(test.reported));
    const json::object bag{{"version", test.installed}};
    controller_->cacheBagState(
        std::make_shared<const ZLKBag>(std::make_shared<const json::object>(bag), std::nullopt),
        BagOrigin::Network);
    controller_->forceFetchBag(test.reported);
    ASSERT_EQ(fetchesUnderWay(), test.fetched.empty() ? 0u : 1u);
    if (test.fetched.empty()) continue;
    EXPECT_EQ(session().pending()[0]->request().url,
              "https://api.zelkor.example/bag?v=" + std::string(test.fetched));
    reply(500, "");
  }
}

TEST_F(ZelkorBagControllerTest, ABagOnDiskServesFromTheStart) {
  putOnDisk(600, "7");
  make();
  EXPECT_EQ(controller_->inMemoryBag()->version(), "7");
  EXPECT_THAT(notified_, ElementsAre("7"));
  EXPECT_THAT(platform_.systemNotifications.names(), IsEmpty());
  EXPECT_EQ(fetchesUnderWay(), 0u);
}

TEST_F(ZelkorBagControllerTest, ADueBagOnDiskServesUntilTheFetchEnds) {
  putOnDisk(599, "7");
  make();
  EXPECT_EQ(controller_->inMemoryBag()->version(), "7");
  install(R"({"version": 8})");
  EXPECT_EQ(controller_->inMemoryBag()->version(), "8");
  controller_->cacheBagState(std::make_shared<const ZLKBag>(nullptr, std::nullopt),
                             BagOrigin::Disk);
  EXPECT_EQ(controller_->inMemoryBag()->version(), "8");
}

TEST_F(ZelkorBagControllerTest, ADamagedFileCountsAsNone) {
  struct Case {
    std::string_view name;
    std::optional<std::string> bytes;
    int readError;
    std::string_view logged;  // empty: nothing
  };
  const Case cases[] = {
      {"missing", std::nullopt, 0, ""},
      {"empty", "", 0, "Error reading from bag cache: {"},
      {"cut off", R"(plist {"version": "7", "__exp)", 0, "Error reading from bag cache: {"},
      {"array", "plist [1, 2]", 0, "Unexpected class deserialized from bag cache: array."},
      {"text", "plist \"x\"", 0, "Unexpected class deserialized from bag cache: string."},
      {"unreadable", "plist {}", EACCES, "Error reading from bag cache: {"},
      {"of monstrous size", "plist {\"a\": \"" + std::string(17 << 20, 'x') + "\"}", 0,
       "Error reading from bag cache: {"},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.name);
    platform_.log.clear();
    if (test.bytes) platform_.files.put(kPath, *test.bytes);
    platform_.files.fail(FakeFileManager::Operation::Read, test.readError);
    make();
    EXPECT_EQ(controller_->inMemoryBag(), nullptr);
    EXPECT_THAT(notified_, IsEmpty());
    EXPECT_EQ(platform_.log.count(LogLevel::Error), test.logged.empty() ? 0 : 1);
    EXPECT_TRUE(test.logged.empty() || platform_.log.contains(test.logged));
  }
}

TEST_F(ZelkorBagControllerTest, ABagThatCannotBeStoredStillServes) {
  using Operation = FakeFileManager::Operation;
  struct Case {
    Operation failing;
    int number;
    std::optional<Error> encoding;
    std::vector<std::string_view> logged;
  };
  const Case cases[] = {
      {Operation::Write, ENOSPC, std::nullopt, {"Could not write to /caches/bag.plist"}},
      {Operation::CreateDirectory,
       EROFS,
       std::nullopt,
       {"error creating agent-specific cache directory {",
        "Couldn't get path to cache bag.  Error: {"}},
      {Operation::Read, 0, posixError(EINVAL), {"Error writing bag to persistent cache: {"}},
      {Operation::Read,
       0,
       posixError(ENOMEM),
       {"Error creating bag cache file stream to path /caches/bag.plist."}},
  };
  make();
  readVersion();
  install(R"({"version": "1"})");
  const auto file = platform_.files.bytes(kPath);
  for (const auto& test : cases) {
    SCOPED_TRACE(test.logged[0]);
    platform_.log.clear();
    platform_.files.fail(test.failing, test.number);
    platform_.propertyLists.failure = test.encoding;
    install(R"({"version": "2"})");
    platform_.files.fail(test.failing, 0);
    EXPECT_EQ(controller_->inMemoryBag()->version(), "2");
    EXPECT_EQ(platform_.files.bytes(kPath), file);
    for (const auto text : test.logged) EXPECT_TRUE(platform_.log.contains(text)) << text;
  }
}

TEST_F(ZelkorBagControllerTest, WithTheDiskCacheOffNothingTouchesTheFile) {
  putOnDisk(14400, "7");
  const auto file = platform_.files.bytes(kPath);
  assembly_.disableDiskBagCache();
  make();
  EXPECT_EQ(readVersion(), "no bag");
  install(R"({"version": "8"})");
  EXPECT_EQ(readVersion(), "8");
  EXPECT_EQ(platform_.files.bytes(kPath), file);
  EXPECT_TRUE(platform_.log.contains("skipping check for bag on disk because"));
  EXPECT_TRUE(platform_.log.contains("skipping writing bag to disk because"));
}

TEST_F(ZelkorBagControllerTest, TellsTheSystemWhenNewsBecomesAvailableOrNot) {
  make();
  struct Case {
    std::string bag;
    std::vector<std::string> posted;
  };
  const Case cases[] = {
      {"{}", {std::string(kZLKNotifyEnabled)}},
      {R"({"enabled": true})", {}},
      {R"({"agents": {"news": {"enabled": false}}})", {std::string(kZLKNotifyDisabled)}},
      {R"({"enabled": false})", {}},
      {R"({"enabled": false, "agents": {"news": {"enabled": true}}})",
       {std::string(kZLKNotifyEnabled)}},
  };
  std::vector<std::string> all;
  for (const auto& test : cases) {
    SCOPED_TRACE(test.bag);
    install(test.bag);
    all.insert(all.end(), test.posted.begin(), test.posted.end());
    EXPECT_EQ(platform_.systemNotifications.names(), all);
  }
  EXPECT_EQ(platform_.log.count("setting Zelkor News Available status to 1"), 2);
}

TEST_F(ZelkorBagControllerTest, ARefreshNotificationOfTheFactoryLooksAnew) {
  const auto post = [this](const void* object) {
    platform_.notificationCenter.post({std::string(kZLKBagRefreshRequired), object, {}});
    platform_.timeline.runUntilIdle();
    return fetchesUnderWay();
  };
  make();
  EXPECT_EQ(post(this), 0u);
  EXPECT_EQ(post(&requests_), 1u);
  EXPECT_TRUE(platform_.log.contains("no bag URL found in cache"));
  EXPECT_EQ(counted("expired"), 0);
  install("{}");
  EXPECT_EQ(post(&requests_), 0u);
  requests_.country = "FR";
  ++requests_.generation;
  EXPECT_EQ(post(&requests_), 1u);
}

TEST_F(ZelkorBagControllerTest, AFetchMayOutliveTheController) {
  make();
  readVersion();
  controller_.reset();
  reply(200, "{}");
  EXPECT_TRUE(platform_.log.contains(
      "Error fetching bag, bag fetch task completed after BagFetchController was cleaned up"));
  EXPECT_THAT(notified_, IsEmpty());
  EXPECT_THAT(platform_.transactions.openNames(), IsEmpty());
}

TEST_F(ZelkorBagControllerTest, ChoosesWhereToFetchFrom) {
  make();
  struct Case {
    json::value setting;
    std::string_view country;
    std::string_view url;
    int errors;
  };
  const Case cases[] = {
      {nullptr, "DE", "https://api.zelkor.example/bag", 0},
      {nullptr, "", "https://api.zelkor.example/bag", 0},
      {nullptr, "cn", "https://api-cn.zelkor.example/bag", 0},
      {"", "CN", "https://api-cn.zelkor.example/bag", 0},
      {"http://[::1]:8080/bag?x", "CN", "http://[::1]:8080/bag?x", 0},
      {"not a url", "CN", "https://api-cn.zelkor.example/bag", 1},
      {"https://[", "US", "https://api.zelkor.example/bag", 1},
      {"https://[]/bag", "US", "https://api.zelkor.example/bag", 1},
      {"https://[::1/bag", "US", "https://api.zelkor.example/bag", 1},
      {"https://h]/bag", "US", "https://api.zelkor.example/bag", 1},
      {"https://h:port/bag", "US", "https://api.zelkor.example/bag", 1},
      {"https://u:p@[::1]/bag", "US", "https://u:p@[::1]/bag", 0},
      {7, "US", "https://api.zelkor.example/bag", 0},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.url);
    platform_.log.clear();
    platform_.settings.set("ZLKBagURL", test.setting);
    EXPECT_EQ(controller_->bagFetchURLWithCountry(test.country), test.url);
    EXPECT_EQ(platform_.log.count("Malformed zelkor bag URL in user defaults key ZLKBagURL"),
              test.errors);
    EXPECT_EQ(platform_.log.count(LogLevel::Error), test.errors);
  }
}

TEST_F(ZelkorBagControllerTest, RecordsAFetchAsFeedback) {
  const auto sessions = std::make_shared<FetchSessions>();
  const auto guids = std::make_shared<ZelkorUserGUIDController>(assembly_);
  make();
  readVersion();  // before these services have been made: recorded nowhere
  assembly_.feedbackSessions.set(sessions);
  assembly_.guidController.set(guids);
  reply(500, "");
  EXPECT_THAT(sessions->events, IsEmpty());

  readVersion();
  reply(404, "gone");
  EXPECT_THAT(sessions->events,
              ElementsAre("HVStartNetworkSearchFeedback", "HVEndNetworkSearchFeedback",
                          "HVErrorFeedback", "complete"));
  const auto& start =
      dynamic_cast<const HVStartNetworkSearchFeedback&>(*sessions->records[0].feedback);
  EXPECT_EQ(start.input, "");
  EXPECT_EQ(start.url, "https://api.zelkor.example/bag?v=none");
  EXPECT_EQ(start.headers, (StringMap{{"User-Agent", kUserAgent}}));
  EXPECT_EQ(start.triggerEvent.value, 16);
  EXPECT_EQ(start.endpointType.value, 10);
  const auto& end = dynamic_cast<const HVEndNetworkSearchFeedback&>(*sessions->records[1].feedback);
  EXPECT_EQ(start.uuid->size(), 36u);
  EXPECT_EQ(end.uuid, start.uuid);
  EXPECT_FALSE(end.connectionReused || end.interface || end.peerAddress);
  EXPECT_EQ(end.responseSize, 4);
  EXPECT_EQ(end.statusCode, 404);
  EXPECT_THAT(end.networkTimingData->text, testing::HasSubstr("bytes_sent"));
  for (const auto& record : sessions->records) {
    EXPECT_EQ(record.queryId, 0);
    EXPECT_EQ(record.userGuid, guids->currentUserGUID());
    EXPECT_EQ(record.userAgent, kUserAgent);
  }

  readVersion();
  reply(200, "{}");
  EXPECT_EQ(sessions->events.size(), 7u);  // no error record this time
}

}  // namespace
}  // namespace zelkord
