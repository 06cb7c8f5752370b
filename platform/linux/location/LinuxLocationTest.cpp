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
  std::unique_ptr<LocationManager> makeManager() {
    return location_.makeManager("bundle", {}, delegate_, *queue_);
  }

  ManualTimeline timeline_;
  NotificationCenter center_;
  DeviceProfileStore store_{center_, "en_US"};
  FakeSettings settings_;
  DeviceProfile profile_;
  int sources_ = 0;
  LocationSourceEvents events_;
  LinuxLocation location_{store_, settings_, timeline_,
                          [this](const LocationOptions&, LocationSourceEvents events) {
                            events_ = std::move(events);
                            return std::make_unique<ProvidedSource>(sources_);
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
  manager->startUpdating();
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
  manager->stopUpdating();
  EXPECT_EQ(sources_, 0);
  manager->startUpdating();
  events_.fix({.latitude = 6});
  manager.reset();
  EXPECT_THAT(latitudes(), ElementsAre(5, 1)) << "nothing after the manager's end";
  EXPECT_EQ(sources_, 0);
}

TEST_F(LinuxLocationTest, ReadsTheGrantBeforeTheProfile) {
  EXPECT_EQ(location_.authorization("bundle"), 4);
  const auto manager = makeManager();
  location_.setAuthorization("bundle", 2);
  EXPECT_EQ(settings_.value("ZLKLocationAuthorization"), json::value(2));
  location_.setAuthorization("bundle", 2);
  profile_.locationAuthorization = 3;
  replace();
  EXPECT_EQ(location_.authorization("other"), 2);
  EXPECT_THAT(delegate_->statuses, ElementsAre(2));
  settings_.set("ZLKLocationAuthorization", "nonsense");
  EXPECT_EQ(location_.authorization("bundle"), 3);
}

TEST_F(LinuxLocationTest, IsSilentWhereItIsOffOrForbidden) {
  moveTo(1);
  const auto manager = makeManager();
  profile_.locationServicesEnabled = false;
  replace();
  EXPECT_FALSE(location_.isEnabledSystemWide());
  manager->startUpdating();
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
