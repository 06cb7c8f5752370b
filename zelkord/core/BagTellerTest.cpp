#include <gtest/gtest.h>

#include "corezelkor/Constants.h"
#include "zelkord/core/BagTeller.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/core/DaemonTestSupport.h"
#include "zelkord/network/bag/ZelkorBagController.h"

namespace zelkord {
namespace {

// A connection whose client is told things while something else happens.
class InterruptedConnection final : public ipc::Connection {
 public:
  explicit InterruptedConnection(std::function<void()> interruption)
      : interruption_(std::move(interruption)) {}

  ipc::Peer peer() const override { return {}; }
  void setHandler(std::shared_ptr<ipc::CallHandler>) override {}
  void setInvalidationHandler(std::function<void()>) override {}
  void invalidate() override {}
  void callClient(std::string_view, std::string_view, std::string_view, std::string_view,
                  ipc::Values values, std::function<void(const Error&)>) override {
    const auto& bag = *values.at(0).get<ipc::Dictionary>();
    const auto version = bag.find("version");
    versions.push_back(version == bag.end() ? "none" : *version->second.get<std::string>());
    if (const auto interrupt = std::exchange(interruption_, nullptr)) interrupt();
  }

  std::vector<std::string> versions;  // of the bags that were told

 private:
  std::function<void()> interruption_;
};

class BagTellerTest : public testing::Test {
 protected:
  std::shared_ptr<ipc::FakeAnswer> beginConfigure(const DaemonBed::Client& client) {
    return client->call(std::string(kDaemonInterface), "Configure",
                        {ipc::Dictionary{{"identifier", "lanthe"}, {"userAgent", "Lanthe/9"}}});
  }

  DaemonBed bed_;
};

TEST_F(BagTellerTest, TellsABagThatComesRightAfterTheFailedWait) {
  auto& assembly = bed_.daemon.assembly();
  const auto connection = std::make_shared<InterruptedConnection>([&] {
    const json::object dictionary{{"version", "5"}, {"__refresh_disabled", true}};
    assembly.bagController()->cacheBagState(
        std::make_shared<const ZLKBag>(std::make_shared<const json::object>(dictionary), "daemon"),
        BagOrigin::Network);
  });
  const auto teller = std::make_shared<BagTeller>(assembly, connection);
  teller->clientConfigured(assembly.clientStateManager()->stateForClientIdentifier("lanthe"),
                           "Lanthe/9");
  bed_.fakes.timeline.advance(2s);
  EXPECT_EQ(connection->versions, (std::vector<std::string>{"none", "5"}));
}

TEST_F(BagTellerTest, AClientThatConfiguresItselfAllTheTimeKeepsOneWaitBusy) {
  const auto client = bed_.connect();
  std::vector<DaemonBed::Answer> answers{beginConfigure(client)};
  bed_.fakes.timeline.runUntil([&] { return answers.front()->answered; });
  for (int i = 0; i < 50; ++i) answers.push_back(beginConfigure(client));
  bed_.fakes.timeline.advance(5s);
  for (const auto& answer : answers) EXPECT_TRUE(answer->succeeded());
  EXPECT_EQ(client->callbacks().size(), 2u);  // of the first one, and of all that came during it
}

TEST_F(BagTellerTest, DoesNotCallAClientThatHasGone) {
  const auto client = bed_.connect();
  beginConfigure(client);
  const auto leaving = bed_.fakes.timeline.global(QualityOfService::Default).after(500ms, [&] {
    client->disconnect();
  });
  bed_.fakes.timeline.advance(5s);
  EXPECT_FALSE(bed_.fakes.log.contains("remote proxy error"));
  EXPECT_FALSE(bed_.fakes.log.contains("sending bag"));
}

TEST_F(BagTellerTest, DoesNotWaitForABagForAClientThatHasGone) {
  const auto& assembly = bed_.daemon.assembly();
  const auto teller = std::make_shared<BagTeller>(bed_.daemon.assembly(),
                                                  std::make_shared<InterruptedConnection>(nullptr));
  teller->clientConfigured(assembly.clientStateManager()->stateForClientIdentifier("lanthe"),
                           "Lanthe/9");
  teller->end();
  const auto begin = bed_.fakes.timeline.now();
  bed_.run();
  EXPECT_EQ(bed_.fakes.timeline.now(), begin);
}

TEST_F(BagTellerTest, HidesTheQueriesOfABagsURLsInTheLog) {
  for (const bool shows : {false, true}) {
    SCOPED_TRACE(shows);
    DaemonBed bed;
    bed.fakes.log.setShowsPrivateData(shows);
    bed.connectAndConfigure();
    bed.installBag(
        R"({"search_url":"https://s.example/s?a=secret","list":[{"u":"https://i.example/?b=secret"}]})");
    EXPECT_TRUE(bed.fakes.log.contains("bag change notification: {"));
    EXPECT_EQ(bed.fakes.log.contains("https://s.example/s?<private>"), !shows);
    EXPECT_EQ(bed.fakes.log.contains("secret"), shows);
  }
}

}  // namespace
}  // namespace zelkord
