#include <gmock/gmock.h>
#include <systemd/sd-bus.h>

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <optional>

#include "platform/linux/bus/BusThread.h"
#include "platform/linux/ipc/IpcTestSupport.h"
#include "platform/linux/locale/HostLocaleWatcher.h"
#include "platform/linux/location/GeoClueSource.h"
#include "platform/linux/location/LinuxLocation.h"
#include "platform/testing/FakeSettings.h"

namespace zelkord {
namespace {

using testing::HasSubstr;

// A system bus of the test's own for as long as it lives.
class PrivateSystemBus final {
 public:
  PrivateSystemBus() { ::setenv("DBUS_SYSTEM_BUS_ADDRESS", bus_->address().c_str(), 1); }
  ~PrivateSystemBus() { ::unsetenv("DBUS_SYSTEM_BUS_ADDRESS"); }

  // Everybody is thrown off.
  void restart() {
    bus_->stop();
    bus_.emplace(directory_.path());
  }

 private:
  const ipc::IpcTestDirectory directory_;
  std::optional<ipc::IpcTestBus> bus_{directory_.path()};
};

// What the doubles say and were told; the bus reads and writes it in place.
struct HostServicesState {
  sd_bus* bus = nullptr;
  bool denies = false;
  const char* language = "LANG=fr_FR.UTF-8";
  char* desktopId = nullptr;
  unsigned accuracyLevel = 0;
  double latitude = 52.5;
  double longitude = 13.4;
  double accuracy = 400;
};

// GeoClue and locale1 as far as they matter here: one client, one location; one property.
class HostServicesDouble final {
 public:
  explicit HostServicesDouble(const char* name, bool denies = false)
      : thread_(openSystemBus(nullptr)) {
    auto* bus = state_.bus = thread_.bus();
    state_.denies = denies;
    ::sd_bus_add_object_vtable(bus, nullptr, "/org/freedesktop/GeoClue2/Manager",
                               "org.freedesktop.GeoClue2.Manager", kManager, &state_);
    ::sd_bus_add_object_vtable(bus, nullptr, "/client", "org.freedesktop.GeoClue2.Client", kClient,
                               &state_);
    ::sd_bus_add_object_vtable(bus, nullptr, "/location", "org.freedesktop.GeoClue2.Location",
                               kLocation, &state_);
    ::sd_bus_add_object_vtable(bus, nullptr, "/org/freedesktop/locale1", "org.freedesktop.locale1",
                               kLocale, &state_);
    ::sd_bus_request_name(bus, name, 0);
  }
  ~HostServicesDouble() { ::free(state_.desktopId); }
  void start(const char* language = "LANG=fr_FR.UTF-8") {
    state_.language = language;
    thread_.start([] {});
  }

 private:
  static int _getClient(sd_bus_message* call, void*, sd_bus_error*) {
    return ::sd_bus_reply_method_return(call, "o", "/client");
  }
  static int _startClient(sd_bus_message* call, void* self, sd_bus_error* error) {
    const auto& state = *static_cast<HostServicesState*>(self);
    if (state.denies || !state.desktopId || state.accuracyLevel == 0) {
      return ::sd_bus_error_set(error, "org.freedesktop.DBus.Error.AccessDenied", "no");
    }
    ::sd_bus_reply_method_return(call, "");
    return ::sd_bus_emit_signal(state.bus, "/client", "org.freedesktop.GeoClue2.Client",
                                "LocationUpdated", "oo", "/", "/location");
  }
  static int _getLocale(sd_bus*, const char*, const char*, const char*, sd_bus_message* reply,
                        void* self, sd_bus_error*) {
    const auto& state = *static_cast<HostServicesState*>(self);
    return ::sd_bus_message_append(reply, "as", 2, state.language, "LC_TIME=C");
  }

  static const sd_bus_vtable kManager[];
  static const sd_bus_vtable kClient[];
  static const sd_bus_vtable kLocation[];
  static const sd_bus_vtable kLocale[];

  HostServicesState state_;
  BusThread thread_;
};

const sd_bus_vtable HostServicesDouble::kManager[] = {
    SD_BUS_VTABLE_START(0),
    SD_BUS_METHOD("GetClient", "", "o", _getClient, SD_BUS_VTABLE_UNPRIVILEGED), SD_BUS_VTABLE_END};
const sd_bus_vtable HostServicesDouble::kClient[] = {
    SD_BUS_VTABLE_START(0),
    SD_BUS_METHOD("Start", "", "", _startClient, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_WRITABLE_PROPERTY("DesktopId", "s", nullptr, nullptr,
                             offsetof(HostServicesState, desktopId), SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_WRITABLE_PROPERTY("RequestedAccuracyLevel", "u", nullptr, nullptr,
                             offsetof(HostServicesState, accuracyLevel),
                             SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_VTABLE_END};
const sd_bus_vtable HostServicesDouble::kLocation[] = {
    SD_BUS_VTABLE_START(0),
    SD_BUS_PROPERTY("Latitude", "d", nullptr, offsetof(HostServicesState, latitude), 0),
    SD_BUS_PROPERTY("Longitude", "d", nullptr, offsetof(HostServicesState, longitude), 0),
    SD_BUS_PROPERTY("Accuracy", "d", nullptr, offsetof(HostServicesState, accuracy), 0),
    SD_BUS_VTABLE_END};
const sd_bus_vtable HostServicesDouble::kLocale[] = {
    SD_BUS_VTABLE_START(0),
    SD_BUS_PROPERTY("Locale", "as", _getLocale, 0, SD_BUS_VTABLE_PROPERTY_EMITS_CHANGE),
    SD_BUS_VTABLE_END};

// What a source tells, waited for.
class HeardEvents final {
 public:
  LocationSourceEvents events() {
    return {[this](const LocationFix& fix) {
              note(fmt::format("{} {} {} type {}", fix.latitude, fix.longitude,
                               fix.horizontalAccuracy, fix.type));
            },
            [this](const Error& error) { note(fmt::format("failure {}", error.code)); },
            [this] { ++ends_; }};
  }
  int ends() const { return ends_; }
  void note(std::string text) {
    const std::lock_guard lock(mutex_);
    text_ = std::move(text);
    arrived_.notify_all();
  }
  // The last one that came.
  std::string wait() {
    std::unique_lock lock(mutex_);
    arrived_.wait_for(lock, ipc::kTestPatience, [this] { return !text_.empty(); });
    return text_;
  }
  bool hasHeard() {
    const std::lock_guard lock(mutex_);
    return !text_.empty();
  }

 private:
  std::mutex mutex_;
  std::condition_variable arrived_;
  std::string text_;
  std::atomic<int> ends_ = 0;
};

class GeoClueSourceTest : public testing::Test {
 protected:
  std::unique_ptr<LocationSource> make() {
    return GeoClueSource::make({}, heard_.events(), clock_, [this](const std::string& problem) {
      heard_.note("missing: " + problem);
    });
  }

  const LinuxClock clock_;
  HeardEvents heard_;
};

TEST_F(GeoClueSourceTest, TellsTheLocationOfAStartedClient) {
  const PrivateSystemBus bus;
  HostServicesDouble services("org.freedesktop.GeoClue2");
  services.start();
  const auto source = make();
  EXPECT_EQ(heard_.wait(), "52.5 13.4 400 type 4");
}

TEST_F(GeoClueSourceTest, ARefusalIsAFailureAndAMissingServiceIsNot) {
  const PrivateSystemBus bus;
  {
    const auto source = make();
    EXPECT_THAT(heard_.wait(), HasSubstr("missing: "));
  }
  heard_.note("");
  HostServicesDouble services("org.freedesktop.GeoClue2", true);
  services.start();
  const auto source = make();
  EXPECT_EQ(heard_.wait(), "failure 13");
}

TEST_F(GeoClueSourceTest, EndsWithTheServiceAndWithTheBus) {
  PrivateSystemBus bus;
  std::optional<HostServicesDouble> services("org.freedesktop.GeoClue2");
  services->start();
  auto source = make();
  EXPECT_EQ(heard_.wait(), "52.5 13.4 400 type 4");
  EXPECT_EQ(heard_.ends(), 0);
  services.reset();
  EXPECT_TRUE(ipc::eventually([this] { return heard_.ends() == 1; }));

  services.emplace("org.freedesktop.GeoClue2");
  services->start();
  heard_.note("");
  source = make();
  EXPECT_EQ(heard_.wait(), "52.5 13.4 400 type 4");
  bus.restart();
  EXPECT_TRUE(ipc::eventually([this] { return heard_.ends() >= 2; }));
}

// Takes down the last thing that it heard.
class NotingDelegate final : public LocationDelegate {
 public:
  HeardEvents heard;
  void didUpdateLocations(const std::vector<LocationFix>& fixes) override {
    heard.events().fix(fixes.back());
  }
  void didChangeAuthorizationStatus(LocationAuthorization) override {}
  void didFailWithError(const Error& error) override { heard.events().failure(error); }
};

TEST_F(GeoClueSourceTest, IsAskedAgainAfterAnAbsenceARefusalAndARestart) {
  PrivateSystemBus bus;
  const LinuxClock clock(1000);  // the wait between attempts is 0.3 s
  LinuxWorkQueues queues(clock, 2);
  NotificationCenter center;
  DeviceProfileStore store(center, "en_US");
  FakeSettings settings;
  settings.set("ZLKLocationAuthorization", 4);
  std::atomic<int> absences = 0;
  LinuxLocation location(store, settings, clock, queues,
                         [&](const LocationOptions& options, LocationSourceEvents events) {
                           return GeoClueSource::make(options, std::move(events), clock,
                                                      [&](const std::string&) { ++absences; });
                         });
  const auto queue = queues.makeSerialQueue("delegate");
  const auto delegate = std::make_shared<NotingDelegate>();
  const auto manager = location.makeManager("bundle", {}, delegate, *queue);
  // As searches do.
  const auto askUntil = [&](const std::function<bool()>& done) {
    return ipc::eventually([&] {
      manager->startUpdating();
      return done();
    });
  };
  EXPECT_TRUE(askUntil([&] { return absences > 0; }));
  {
    HostServicesDouble refusing("org.freedesktop.GeoClue2", true);
    refusing.start();
    EXPECT_TRUE(askUntil([&] { return delegate->heard.hasHeard(); }));
    EXPECT_EQ(delegate->heard.wait(), "failure 13");
  }
  bus.restart();
  delegate->heard.note("");
  HostServicesDouble granting("org.freedesktop.GeoClue2");
  granting.start();
  EXPECT_TRUE(askUntil([&] { return delegate->heard.hasHeard(); }));
  EXPECT_EQ(delegate->heard.wait(), "52.5 13.4 400 type 4");
}

TEST_F(GeoClueSourceTest, WithoutASystemBusThereIsNoSource) {
  ::setenv("DBUS_SYSTEM_BUS_ADDRESS", "unix:path=/nowhere", 1);
  EXPECT_EQ(make(), nullptr);
  ::unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
  EXPECT_THAT(heard_.wait(), HasSubstr("missing: "));
}

TEST(HostLocaleWatcherTest, HearsOfTheSystemsLocaleAlsoAfterTheBusHasRestarted) {
  PrivateSystemBus bus;
  const LinuxClock clock;
  LinuxWorkQueues queues(clock, 2);
  RecordingLog log;
  Loop host("test-host");
  PathWatcher files(host, log);
  HeardEvents heard;
  HostLocaleSources sources;
  sources.environment = [](const std::string&) { return "de_DE"; };
  HostLocaleWatcher watcher(
      sources, [&](const HostLocale& changed) { heard.note(changed.locale); }, queues, host, files,
      log);
  for (const auto& [language, locale] :
       {std::pair{"LANG=fr_FR.UTF-8", "fr_FR"}, {"LANG=it_IT.UTF-8", "it_IT"}}) {
    SCOPED_TRACE(locale);
    HostServicesDouble services("org.freedesktop.locale1");
    services.start(language);
    // The watcher listens from a moment on that only the bus knows.
    const auto announcer = openSystemBus(nullptr);
    const std::string expected = locale;
    EXPECT_TRUE(ipc::eventually([&] {
      ::sd_bus_emit_signal(announcer.get(), "/org/freedesktop/locale1",
                           "org.freedesktop.DBus.Properties", "PropertiesChanged", "sa{sv}as",
                           "org.freedesktop.locale1", 0, 1, "Locale");
      ::sd_bus_process(announcer.get(), nullptr);
      return heard.hasHeard() && heard.wait() == expected;
    }));
    bus.restart();
  }
}

TEST(HostLocaleWatcherTest, ReadsWhatTheSystemSaidWhileTheBusWasAway) {
  PrivateSystemBus bus;
  const LinuxClock clock;
  LinuxWorkQueues queues(clock, 2);
  RecordingLog log;
  Loop host("test-host");
  PathWatcher files(host, log);
  HeardEvents heard;
  HostLocaleSources sources;
  sources.environment = [](const std::string&) { return "de_DE"; };
  std::optional<HostLocaleWatcher> watcher(
      std::in_place, sources, [&](const HostLocale& changed) { heard.note(changed.locale); },
      queues, host, files, log);
  const auto announcer = openSystemBus(nullptr);
  EXPECT_TRUE(ipc::eventually([&] {
    ::sd_bus_emit_signal(announcer.get(), "/org/freedesktop/timedate1",
                         "org.freedesktop.DBus.Properties", "PropertiesChanged", "sa{sv}as",
                         "org.freedesktop.timedate1", 0, 0);
    ::sd_bus_process(announcer.get(), nullptr);
    return heard.hasHeard();
  }));
  EXPECT_EQ(heard.wait(), "de_DE") << "the environment counts at first";

  PrivateSystemBus next;  // on which the service is before the watcher
  HostServicesDouble services("org.freedesktop.locale1");
  services.start("LANG=it_IT.UTF-8");
  bus.restart();
  EXPECT_TRUE(ipc::eventually([&] { return heard.wait() == "it_IT"; }));
  watcher.reset();
}

}  // namespace
}  // namespace zelkord
