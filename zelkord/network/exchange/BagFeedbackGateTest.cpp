#include <gtest/gtest.h>

#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/exchange/BagFeedbackGate.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"

namespace zelkord {
namespace {

class BagFeedbackGateTest : public testing::Test {
 protected:
  void install(const char* text) {
    const auto factory = std::make_shared<ZLKNetworkRequestFactory>(assembly_);
    if (!assembly_.bagController()) {
      assembly_.requestFactory.set(factory);
      assembly_.bagController.set(std::make_shared<ZelkorBagController>(assembly_, *factory));
    }
    assembly_.bagController()->cacheBagState(
        std::make_shared<const ZLKBag>(
            std::make_shared<const json::object>(parseJson(text)->as_object()), std::nullopt),
        BagOrigin::Network);
    fakes_.timeline.runUntilIdle();
  }

  FakePlatform fakes_;
  Assembly assembly_{fakes_.platform()};
  BagFeedbackGate gate_{assembly_};
};

TEST_F(BagFeedbackGateTest, AsksTheBagAsTheUserAgentSeesIt) {
  EXPECT_FALSE(gate_.dropsFeedback("Lanthe/9"));  // no controller, then no bag
  install(R"({"feedback_enabled":true,"agents":{"brelin":{"feedback_enabled":false}}})");
  for (int i = 0; i < 2; ++i) {
    EXPECT_FALSE(gate_.dropsFeedback("Lanthe/9"));
    EXPECT_TRUE(gate_.dropsFeedback("Brelin/1"));
    EXPECT_FALSE(gate_.dropsFeedback(std::nullopt));
  }
  install(R"({"version":"2"})");  // silent about feedback: not wanted
  EXPECT_TRUE(gate_.dropsFeedback("Lanthe/9"));
  EXPECT_TRUE(gate_.dropsFeedback(std::nullopt));
}

TEST_F(BagFeedbackGateTest, AnswersAnyNumberOfUserAgents) {
  install(R"({"agents":{"7":{"feedback_enabled":true}}})");
  for (int i = 0; i < 500; ++i) {
    const auto agent = "Agent/" + std::to_string(i);
    EXPECT_EQ(gate_.dropsFeedback(agent), agent.find('7') == std::string::npos) << agent;
  }
}

}  // namespace
}  // namespace zelkord
