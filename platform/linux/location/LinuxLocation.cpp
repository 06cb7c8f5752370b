#include "platform/linux/location/LinuxLocation.h"

#include <vector>

#include "base/Mutex.h"

namespace zelkord {
namespace {

constexpr std::string_view kLocationAuthorizationKey = "ZLKLocationAuthorization";

std::optional<LocationAuthorization> grantedAuthorization(const SettingsStore& settings) {
  const auto value = settings.value(kLocationAuthorizationKey);
  const auto number = value ? asNumber(*value) : std::nullopt;
  if (!number || *number < 0 || *number > 4) return std::nullopt;
  return static_cast<LocationAuthorization>(*number);
}

LocationAuthorization authorizationOf(const SettingsStore& settings, const DeviceProfile& profile) {
  return grantedAuthorization(settings).value_or(profile.locationAuthorization.value_or(0));
}

bool isEnabledIn(const DeviceProfile& profile) {
  return profile.locationServicesEnabled.value_or(true);
}

LocationFix fixOfProfile(const DeviceProfile::Location& location, const Clock& clock) {
  return {location.latitude, location.longitude, location.horizontalAccuracy, location.type,
          clock.now() - durationOfSeconds(location.age)};
}

}  // namespace

// What the service shares with its managers' clients.
struct LinuxLocation::Shared {
  DeviceProfileStore& store;
  SettingsStore& settings;
  const Clock& clock;
  const LocationSourceFactory provider;

  Mutex mutex;
  std::vector<std::weak_ptr<Client>> clients ZK_GUARDED_BY(mutex);

  bool mayTell() const {
    const auto profile = store.current();
    return isEnabledIn(*profile) && authorizationOf(settings, *profile) >= 3;
  }
  std::vector<std::shared_ptr<Client>> liveClients() {
    std::vector<std::shared_ptr<Client>> live;
    const MutexLock lock(mutex);
    std::erase_if(clients, [&](const auto& weak) {
      const auto client = weak.lock();
      if (client) live.push_back(client);
      return !client;
    });
    return live;
  }
};

// A manager's inside: it may outlive the manager for as long as a call-back runs.
class LinuxLocation::Client final : public std::enable_shared_from_this<Client> {
 public:
  Client(std::shared_ptr<Shared> shared, const LocationOptions& options,
         std::weak_ptr<LocationDelegate> delegate, WorkQueue& queue)
      : shared_(std::move(shared)),
        options_(options),
        delegate_(std::move(delegate)),
        queue_(queue) {}

  void start() {
    setUpdating(true);
    update();
  }

  void stop() {
    setUpdating(false);
    exchangeSource(nullptr);
  }

  bool isUpdating() const {
    const MutexLock lock(mutex_);
    return updating_;
  }

  // Tells the profile's location, or sees to it that the provider runs.
  void update() {
    if (!shared_->mayTell()) return;
    const auto profile = shared_->store.current();
    if (!profile->location) return startProvider();
    exchangeSource(nullptr);
    tellFix(fixOfProfile(*profile->location, shared_->clock));
  }

  void tellAuthorization(LocationAuthorization status) {
    tell([status](LocationDelegate& to) { to.didChangeAuthorizationStatus(status); });
  }

 private:
  void setUpdating(bool updating) {
    const MutexLock lock(mutex_);
    updating_ = updating;
  }

  // The old one ends with the parameter, outside the lock: its call-backs may be waiting for it.
  void exchangeSource(std::unique_ptr<LocationSource> source) {
    const MutexLock lock(mutex_);
    if (updating_ || !source) source_.swap(source);
  }

  void startProvider() {
    {
      const MutexLock lock(mutex_);
      if (source_) return;
    }
    LocationSourceEvents events;
    events.fix = [weak = weak_from_this()](const LocationFix& fix) {
      const auto self = weak.lock();
      if (self && self->isUpdating() && self->shared_->mayTell()) self->tellFix(fix);
    };
    events.failure = [weak = weak_from_this()](const Error& error) {
      const auto self = weak.lock();
      if (self && self->isUpdating()) {
        self->tell([error](LocationDelegate& to) { to.didFailWithError(error); });
      }
    };
    exchangeSource(shared_->provider ? shared_->provider(options_, std::move(events)) : nullptr);
  }

  void tellFix(const LocationFix& fix) {
    tell([fix](LocationDelegate& to) { to.didUpdateLocations({fix}); });
  }

  void tell(std::function<void(LocationDelegate&)> event) {
    queue_.async([weak = weak_from_this(), event = std::move(event)] {
      const auto self = weak.lock();
      const auto delegate = self ? self->delegate_.lock() : nullptr;
      if (delegate) event(*delegate);
    });
  }

  const std::shared_ptr<Shared> shared_;
  const LocationOptions options_;
  const std::weak_ptr<LocationDelegate> delegate_;
  WorkQueue& queue_;

  mutable Mutex mutex_;
  bool updating_ ZK_GUARDED_BY(mutex_) = false;
  std::unique_ptr<LocationSource> source_ ZK_GUARDED_BY(mutex_);
};

class LinuxLocation::Manager final : public LocationManager {
 public:
  explicit Manager(std::shared_ptr<Client> client) : client_(std::move(client)) {}
  ~Manager() override { client_->stop(); }
  void startUpdating() override { client_->start(); }
  void stopUpdating() override { client_->stop(); }

 private:
  const std::shared_ptr<Client> client_;
};

LinuxLocation::LinuxLocation(DeviceProfileStore& store, SettingsStore& settings, const Clock& clock,
                             LocationSourceFactory provider)
    : shared_(new Shared{store, settings, clock, std::move(provider), {}, {}}) {
  profileChanges_ = store.observe([this](const DeviceProfile& before, const DeviceProfile& after) {
    profileChanged(before, after);
  });
}

LinuxLocation::~LinuxLocation() = default;

bool LinuxLocation::isEnabledSystemWide() const { return isEnabledIn(*shared_->store.current()); }

LocationAuthorization LinuxLocation::authorization(const std::string&) const {
  return authorizationOf(shared_->settings, *shared_->store.current());
}

void LinuxLocation::setAuthorization(const std::string& bundlePath, LocationAuthorization status) {
  if (authorization(bundlePath) == status) return;
  shared_->settings.set(kLocationAuthorizationKey, status);
  for (const auto& client : shared_->liveClients()) client->tellAuthorization(status);
}

std::unique_ptr<LocationManager> LinuxLocation::makeManager(
    const std::string&, const LocationOptions& options, std::weak_ptr<LocationDelegate> delegate,
    WorkQueue& queue) {
  auto client = std::make_shared<Client>(shared_, options, std::move(delegate), queue);
  const MutexLock lock(shared_->mutex);
  shared_->clients.push_back(client);
  return std::make_unique<Manager>(std::move(client));
}

void LinuxLocation::profileChanged(const DeviceProfile& before, const DeviceProfile& after) {
  const auto status = authorizationOf(shared_->settings, after);
  const bool permissionChanged = status != authorizationOf(shared_->settings, before) ||
                                 isEnabledIn(before) != isEnabledIn(after);
  const bool moved = before.location != after.location;
  for (const auto& client : shared_->liveClients()) {
    if (permissionChanged) client->tellAuthorization(status);
    if ((moved || permissionChanged) && client->isUpdating()) client->update();
  }
}

}  // namespace zelkord
