#include <gmock/gmock.h>

#include <cerrno>

#include "platform/linux/location/LinuxLocation.h"
#include "platform/testing/FakeSettings.h"
#include "platform/testing/ManualTimeline.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

// Takes down what a delegate hears.
class HearingDelegate final : public LocationDelegate {
 public:
  std::vector<LocationFix> fixes;
  std::vector<int> statuses;
  std::vector<std::int64_t> failures;

  void didUpdateLocations(const std::vector<LocationFix>& update) override {
    fixes.insert(fixes.end(), update.begin(), update.end());
  }
  void didChangeAuthorizationStatus(LocationAuthorization status) override {
    statuses.push_back(status);
  }
  void didFailWithError(const Error& error) override { failures.push_back(error.code); }
};

struct ProvidedSource final : LocationSource {
  explicit ProvidedSource(int& count) : running(count) { ++running; }
  ~ProvidedSource() override { --running; }
  int& running;
};

class LinuxLocationTest : public testing::Test {
 protected:
  LinuxLocationTest() {
    profile_.locationAuthorization = 4;
    store_.replace(profile_);
  }
  void moveTo(double latitude) {
    profile_.location = DeviceProfile::Location{latitude, 8, 50, 1, 10};
    replace();
  }
  void replace() {
    store_.replace(profile_);
    timeline_.runUntilIdle();
  }
  std::vector<double> latitudes() {
    timeline_.runUntilIdle();
    std::vector<double> latitudes;
    for (const auto& fix : delegate_->fixes) latitudes.push_back(fix.latitude);
    return latitudes;
  }
  void start(LocationManager& manager) {
    manager.startUpdating();
    timeline_.runUntilIdle();
  }
  void stop(LocationManager& manager) {
    manager.stopUpdating();
    timeline_.runUntilIdle();
  }
  void setAuthorization(json::value value) {
    settings_.set("ZLKLocationAuthorization", std::move(value));
    timeline_.runUntilIdle();
  }
  std::unique_ptr<LocationManager> makeManager() {
    return location_.makeManager("bundle", {}, delegate_, *queue_);
  }

  ManualTimeline timeline_;
  NotificationCenter center_;
  DeviceProfileStore store_{center_, "en_US"};
  FakeSettings settings_;
  DeviceProfile profile_;
  bool hasProvider_ = true;
  int attempts_ = 0;
  int sources_ = 0;
  LocationSourceEvents events_;
  LinuxLocation location_{store_, settings_, timeline_, timeline_,
                          [this](const LocationOptions&, LocationSourceEvents events) {
                            ++attempts_;
                            events_ = std::move(events);
                            return hasProvider_ ? std::make_unique<ProvidedSource>(sources_)
                                                : nullptr;
                          }};
  const std::unique_ptr<SerialQueue> queue_ = timeline_.makeSerialQueue("delegate");
  const std::shared_ptr<HearingDelegate> delegate_ = std::make_shared<HearingDelegate>();
};

TEST_F(LinuxLocationTest, TellsTheProfilesLocationOnceAStartAndOnceAMove) {
  moveTo(1);
  const auto manager = makeManager();
  EXPECT_THAT(latitudes(), IsEmpty());
  manager->startUpdating();
  EXPECT_THAT(delegate_->fixes, IsEmpty()) << "never on the caller's own thread";
  EXPECT_THAT(latitudes(), ElementsAre(1));
  EXPECT_EQ(delegate_->fixes[0].time, timeline_.now() - 10s);
  moveTo(2);
  profile_.country = "DE";
  replace();
  manager->startUpdating();
  EXPECT_THAT(latitudes(), ElementsAre(1, 2, 2));
  manager->stopUpdating();
  moveTo(3);
  EXPECT_THAT(latitudes(), ElementsAre(1, 2, 2));
  EXPECT_EQ(sources_, 0);
}

TEST_F(LinuxLocationTest, AsksTheProviderOnlyWhileUpdatingWithoutAProfilesLocation) {
  auto manager = makeManager();
  EXPECT_EQ(sources_, 0);
  start(*manager);
  EXPECT_EQ(sources_, 1);
  events_.fix({.latitude = 5});
  events_.failure(posixError(EACCES));
  EXPECT_THAT(latitudes(), ElementsAre(5));
  EXPECT_THAT(delegate_->failures, ElementsAre(EACCES));
  moveTo(1);
  EXPECT_EQ(sources_, 0);
  profile_.location.reset();
  replace();
  EXPECT_EQ(sources_, 1);
  stop(*manager);
  EXPECT_EQ(sources_, 0);
  start(*manager);
  events_.fix({.latitude = 6});
  manager.reset();
  EXPECT_THAT(latitudes(), ElementsAre(5, 1)) << "nothing after the manager's end";
  EXPECT_EQ(sources_, 0);
}

TEST_F(LinuxLocationTest, AProviderThatEndsIsTriedAgainForThoseWhoAskedSince) {
  const auto manager = makeManager();
  start(*manager);
  events_.ended();
  timeline_.advance(1h);
  EXPECT_EQ(attempts_, 1) << "nobody has asked since";
  EXPECT_EQ(sources_, 0);

  hasProvider_ = false;
  start(*manager);
  EXPECT_EQ(attempts_, 2);
  timeline_.advance(100s);
  for (int i = 0; i < 3; ++i) start(*manager);
  timeline_.advance(199s);
  EXPECT_EQ(attempts_, 2);
  hasProvider_ = true;
  timeline_.advance(1s);
  EXPECT_EQ(attempts_, 3);
  EXPECT_EQ(sources_, 1);

  start(*manager);  // while it is at it
  events_.ended();
  stop(*manager);  // and wanted no more
  timeline_.advance(1h);
  EXPECT_EQ(attempts_, 3);
  const auto stale = events_;
  start(*manager);
  stale.ended();
  timeline_.runUntilIdle();
  EXPECT_EQ(sources_, 1) << "the end of an earlier one";
}

TEST_F(LinuxLocationTest, TheSettingCountsBeforeTheProfileAndARefusalBeforeAnything) {
  struct Case {
    json::value setting;  // null: none
    int profile;
    LocationAuthorization effective;
  };
  const Case cases[] = {
      {nullptr, 0, 0}, {nullptr, 3, 3}, {nullptr, 2, 2}, {4, 0, 4},   {4, 1, 1}, {4, 2, 2},
      {3, 4, 3},       {0, 4, 0},       {1, 4, 1},       {2, 1, 2},   {2, 0, 2}, {0, 2, 2},
      {5, 3, 3},       {-1, 4, 4},      {"x", 3, 3},     {1.5, 4, 4},
  };
  for (const auto& [setting, profile, effective] : cases) {
    SCOPED_TRACE(json::serialize(setting) + " " + std::to_string(profile));
    profile_.locationAuthorization = profile;
    store_.replace(profile_);
    if (setting.is_null()) {
      settings_.remove("ZLKLocationAuthorization");
    } else {
      settings_.set("ZLKLocationAuthorization", setting);
    }
    EXPECT_EQ(location_.authorization("bundle"), effective);
  }
  location_.setAuthorization("bundle", 3);
  EXPECT_EQ(settings_.value("ZLKLocationAuthorization"), json::value(3));
  EXPECT_EQ(location_.authorization("other"), 3);
}

TEST_F(LinuxLocationTest, EveryWayToRefuseStopsTheProviderAtOnceAndIsTold) {
  const auto manager = makeManager();
  location_.setAuthorization("bundle", 4);
  start(*manager);
  ASSERT_EQ(sources_, 1);
  setAuthorization(2);
  EXPECT_EQ(sources_, 0);
  events_.fix({.latitude = 5});
  setAuthorization(4);
  EXPECT_EQ(sources_, 1);
  profile_.locationAuthorization = 1;
  replace();
  EXPECT_EQ(sources_, 0) << "the grant does not outrank it";
  profile_.locationAuthorization.reset();
  replace();
  EXPECT_EQ(sources_, 1);
  settings_.remove("ZLKLocationAuthorization");
  setAuthorization("nonsense");
  EXPECT_THAT(delegate_->statuses, ElementsAre(2, 4, 1, 4, 0));
  EXPECT_EQ(sources_, 0);
  EXPECT_THAT(delegate_->fixes, IsEmpty());
}

TEST_F(LinuxLocationTest, AFixThatARefusalOvertakesIsNotTold) {
  moveTo(1);
  const auto manager = makeManager();
  manager->startUpdating();
  queue_->async([this] { settings_.set("ZLKLocationAuthorization", 2); });  // the fix stands behind
  EXPECT_THAT(latitudes(), IsEmpty());
  EXPECT_THAT(delegate_->statuses, ElementsAre(2));
}

TEST_F(LinuxLocationTest, IsSilentWhereItIsOffOrForbidden) {
  moveTo(1);
  const auto manager = makeManager();
  profile_.locationServicesEnabled = false;
  replace();
  EXPECT_FALSE(location_.isEnabledSystemWide());
  start(*manager);
  moveTo(2);
  EXPECT_THAT(latitudes(), IsEmpty());

  profile_.locationServicesEnabled = true;
  profile_.locationAuthorization = 1;
  replace();
  EXPECT_THAT(latitudes(), IsEmpty());
  profile_.locationAuthorization = 3;
  replace();
  EXPECT_THAT(latitudes(), ElementsAre(2));
  EXPECT_THAT(delegate_->statuses, ElementsAre(4, 1, 3));
}

}  // namespace
}  // namespace zelkord
