// The request factory and the bag on the real host services, while the profile's file and the
// settings change under them.

#include <gmock/gmock.h>

#include <chrono>
#include <filesystem>
#include <thread>

#include "platform/linux/LinuxPlatform.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestHTTPServer.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"

namespace zelkord {
namespace {

using testing::HasSubstr;

constexpr const char* kProfile = "XDG_CONFIG_HOME/com.quenta.zelkord/device.json";

bool soon(const std::function<bool()>& condition) {
  const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  while (!condition() && std::chrono::steady_clock::now() < limit) {
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  return condition();
}

class HostChangesTest : public testing::Test {
 protected:
  void SetUp() override {
    ::setenv("DBUS_SYSTEM_BUS_ADDRESS", "unix:path=/nonexistent/bus", 1);
    LinuxPlatformOptions options;
    options.usesSessionBus = false;
    options.logFile = root_ / "log";
    options.environment.environment = [this](const std::string& name) {
      return name.starts_with("XDG_") ? std::optional(root_ / name) : std::nullopt;
    };
    Error error;
    host_ = LinuxPlatform::make(options, &error);
    ASSERT_TRUE(host_) << error.description();
    platform().settings.set("ZLKBagURL", json::string(server_.url("/bag")));
    assembly_.emplace(platform());
    const auto factory = std::make_shared<ZLKNetworkRequestFactory>(*assembly_);
    assembly_->requestFactory.set(factory);
    factory->start();
    const auto controller = std::make_shared<ZelkorBagController>(*assembly_, *factory);
    assembly_->bagController.set(controller);
    controller->start();
    controller->currentBag();
    mainLoop_ = std::thread([this] { host_->queues().runMainLoop(); });
  }
  void TearDown() override {
    ::unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
    if (!assembly_) return;
    EXPECT_TRUE(soon([this] { return fetchIsOver(); }));
    host_->queues().stopMainLoop();
    mainLoop_.join();
    assembly_.reset();
  }

  Platform& platform() { return host_->platform(); }
  bool fetchIsOver() { return platform().transactions.openNames().empty(); }
  // As an integrator should: nobody sees half of it.
  void writeProfile(const json::object& profile) {
    root_.write("new.json", json::serialize(profile));
    std::filesystem::create_directories(std::filesystem::path(root_ / kProfile).parent_path());
    std::filesystem::rename(root_ / "new.json", root_ / kProfile);
  }
  // What the bag that is installed was asked for with.
  std::string lastFetch() {
    const auto requests = server_.requests();
    return requests.empty() ? "" : requests.back().target;
  }
  std::string card() {
    ZLKCardRequest query;
    query.cardURL = "https://service.example/card";
    return assembly_->requestFactory()->cardRequest(query, nullptr, std::nullopt)->url;
  }
  bool cardSoonHas(const std::string& text) {
    return soon([&] { return card().find(text) != std::string::npos; });
  }

  const TemporaryDirectory root_;
  TestHTTPServer server_;
  std::unique_ptr<LinuxPlatform> host_;
  std::optional<Assembly> assembly_;
  std::thread mainLoop_;
};

TEST_F(HostChangesTest, TheBagIsAlwaysThatOfTheLanguageAndTheRegion) {
  server_.reply("/bag", TestHTTPReply::make(200, "{}").dripping(1024, 20ms));
  const std::pair<std::string, std::string> places[] = {
      {"de_DE", "DE"}, {"fr_CA", "CA"}, {"ja_JP", "JP"}};
  for (int i = 0; i < 20; ++i) {
    const auto& [locale, country] = places[i % 3];
    SCOPED_TRACE(std::to_string(i) + locale);
    writeProfile({{"locale", locale}, {"country", country}});
    const auto isOfPlace = [&, locale = locale, country = country](const std::string& url) {
      return url.find("locale=" + locale) != std::string::npos &&
             url.find("cc=" + country) != std::string::npos;
    };
    const auto hasBagOfPlace = [&] {
      const auto bag = assembly_->bagController()->inMemoryBag();
      return bag && isOfPlace(stringIn(*bag->rawBag(), "__bagurl").value_or(""));
    };
    EXPECT_TRUE(soon([&] { return hasBagOfPlace() && fetchIsOver(); }));
    ASSERT_TRUE(isOfPlace(lastFetch())) << lastFetch();
  }
}

TEST_F(HostChangesTest, ARefusalOfLocationIsHeardWhereverItIsWritten) {
  server_.reply("/bag", TestHTTPReply::make(200, R"({"supported_geo_location_sources": ["gps"]})"));
  json::object profile = {{"location", {{"latitude", 52.5}, {"longitude", 13.4}, {"type", 1}}}};
  writeProfile(profile);
  EXPECT_TRUE(cardSoonHas("latlng=52.500000,13.400000"));
  platform().settings.set("ZLKLocationAuthorization", 2);
  EXPECT_TRUE(cardSoonHas("geosrc=userno"));
  EXPECT_THAT(card(), testing::Not(HasSubstr("latlng")));

  platform().settings.set("ZLKLocationAuthorization", 4);
  EXPECT_TRUE(cardSoonHas("latlng=52.500000,13.400000"));
  profile["location_authorization"] = 1;
  writeProfile(profile);
  EXPECT_TRUE(cardSoonHas("geosrc=userno"));
  EXPECT_THAT(card(), testing::Not(HasSubstr("latlng")));
}

TEST_F(HostChangesTest, TheReasonForHavingNoBagIsToldInWords) {
  const TestHTTPServer untrusted(TestCertificate::make("127.0.0.1"));
  server_.reply("/broken", TestHTTPReply::make(503));
  server_.reply("/text", TestHTTPReply::make(200, "<html>"));
  std::string refusing;
  {
    const TestHTTPServer closed;
    refusing = closed.url("/bag");
  }
  const std::pair<std::string, std::string> cases[] = {
      {refusing, "connection refused"},
      {untrusted.url("/bag"), "certificate not trusted ("},
      {server_.url("/broken"), "HTTP status 503"},
      {server_.url("/text"), "not JSON"},
      {"http://service.example/bag", "not encrypted"},
  };
  for (const auto& [url, reason] : cases) {
    SCOPED_TRACE(url);
    EXPECT_TRUE(soon([this] { return fetchIsOver(); }));
    platform().settings.set("ZLKBagURL", json::string(url));
    auto& controller = *assembly_->bagController();
    const auto toldReason = [&] {
      controller.currentBag();
      const auto failure = controller.fetchStatus().lastFailure;
      return failure ? failure->reason : "none";
    };
    EXPECT_TRUE(soon([&, reason = reason] { return toldReason().starts_with(reason); }))
        << toldReason();
    EXPECT_EQ(controller.fetchStatus().url, url);
  }
}

}  // namespace
}  // namespace zelkord
