#include <gmock/gmock.h>

#include "platform/testing/FakePlatform.h"
#include "zelkord/assembly/InstalledBag.h"
#include "zelkord/assembly/NotificationNames.h"

namespace zelkord {
namespace {

using testing::ElementsAre;

class InstalledBagTest : public testing::Test {
 protected:
  using Heard = std::vector<std::string>;

  static BagPointer bagOf(const json::object& dictionary) {
    return std::make_shared<const ZLKBag>(std::make_shared<const json::object>(dictionary),
                                          "Zelkord/1");
  }
  void install(int version, BagOrigin origin = BagOrigin::Network) {
    bag_.install(bagOf({{"version", version}}), origin, [](const BagPointer&) {});
  }
  Subscription observe(Heard& heard) {
    return bag_.observe([&heard](BagNews news, const BagPointer& bag) {
      static constexpr const char* kNews[] = {"present ", "change ", "failure "};
      heard.push_back(kNews[static_cast<int>(news)] + (bag ? bag->version().value_or("") : "none"));
    });
  }

  FakePlatform fakes_;
  InstalledBag bag_{fakes_.timeline, fakes_.notificationCenter};
};

TEST_F(InstalledBagTest, TellsThePresentThenWhatComesOnceEach) {
  Heard early, late, gone;
  const auto first = observe(early);
  install(1);
  const auto second = observe(late);
  auto third = observe(gone);
  bag_.tellFailure(Error{});
  third.reset();
  install(2);
  EXPECT_THAT(early, ElementsAre("present none", "change 1", "failure none", "change 2"));
  EXPECT_THAT(late, ElementsAre("present 1", "failure none", "change 2"));
  EXPECT_THAT(gone, ElementsAre("present 1", "failure none"));
  EXPECT_EQ(bag_.get()->version(), "2");
}

TEST_F(InstalledBagTest, WhatComesDuringARegistrationIsToldAfterThePresent) {
  auto& workers = fakes_.timeline.global(QualityOfService::Default);
  install(1);
  workers.async([this] { install(2); });
  Heard heard;
  const auto observation = bag_.observe([&](BagNews, const BagPointer& bag) {
    const auto version = bag->version().value_or("");
    heard.push_back(version);
    if (version == "1") workers.async([this] { install(3); });
  });
  fakes_.timeline.runUntilIdle();
  EXPECT_THAT(heard, ElementsAre("1", "2", "3"));
}

TEST_F(InstalledBagTest, TellsOfAnInstallationWithTheBagBefore) {
  Heard heard;
  const auto observation = fakes_.notificationCenter.observe(
      std::string(kZLKBagChangeNotification), [&](const Notification& notification) {
        heard.push_back("posted " + *(*notification.value<BagPointer>("bag"))->version());
      });
  const std::pair<int, BagOrigin> installations[] = {
      {1, BagOrigin::Disk}, {2, BagOrigin::Network}, {3, BagOrigin::Disk}};
  for (const auto& [version, origin] : installations) {
    bag_.install(bagOf({{"version", version}}), origin, [&](const BagPointer& before) {
      heard.push_back("before " + (before ? *before->version() : "none"));
    });
  }
  EXPECT_THAT(heard, ElementsAre("posted 1", "before none", "posted 2", "before 1"));
}

TEST_F(InstalledBagTest, MakesAViewOnceForEachAgentAndBag) {
  const auto bag = bagOf({{"agents", {{"brelin", {{"enabled", false}}}}}});
  const auto view = bag_.seenBy(bag, "Brelin/1");
  EXPECT_FALSE(view->isEnabled());
  EXPECT_EQ(view->rawBag(), bag->rawBag());
  EXPECT_EQ(bag_.seenBy(bag, "Brelin/1"), view);
  EXPECT_EQ(bag_.seenBy(view, "Zelkord/1")->userAgent(), "Zelkord/1");
  EXPECT_EQ(bag_.seenBy(bag, std::nullopt)->userAgent(), std::nullopt);
  EXPECT_EQ(bag_.seenBy(bag, "Zelkord/1"), bag) << "that is how it was made";
  EXPECT_TRUE(bag_.seenBy(bagOf({}), "Brelin/1")->isEnabled());
  EXPECT_EQ(bag_.seenBy(nullptr, "Brelin/1"), nullptr);
}

}  // namespace
}  // namespace zelkord
