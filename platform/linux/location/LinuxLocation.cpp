#include "platform/linux/location/LinuxLocation.h"

#include "platform/linux/location/LocationClient.h"

namespace zelkord {
namespace {

constexpr std::string_view kLocationAuthorizationKey = "ZLKLocationAuthorization";

bool isRefusal(LocationAuthorization status) { return status == 1 || status == 2; }

std::optional<LocationAuthorization> authorizationSetting(const SettingsStore& settings) {
  const auto choice = choiceSetting(settings, kLocationAuthorizationKey);
  return choice ? std::optional(static_cast<LocationAuthorization>(*choice)) : std::nullopt;
}

LocationAuthorization authorizationOf(const SettingsStore& settings, const DeviceProfile& profile) {
  const auto setting = authorizationSetting(settings);
  const auto profiles = profile.locationAuthorization.value_or(0);
  return isRefusal(profiles) && !isRefusal(setting.value_or(0)) ? profiles
                                                                : setting.value_or(profiles);
}

}  // namespace

class LinuxLocation::Manager final : public LocationManager {
 public:
  explicit Manager(std::shared_ptr<LocationClient> client) : client_(std::move(client)) {}
  ~Manager() override { client_->close(); }
  void startUpdating() override { client_->start(); }
  void stopUpdating() override { client_->stop(); }

 private:
  const std::shared_ptr<LocationClient> client_;
};

LinuxLocation::LinuxLocation(DeviceProfileStore& store, SettingsStore& settings, const Clock& clock,
                             WorkQueues& queues, LocationSourceFactory provider)
    : store_(store),
      settings_(settings),
      clock_(clock),
      provider_(std::move(provider)),
      queue_(queues.makeSerialQueue("com.quenta.zelkord.location")) {
  {
    const MutexLock lock(tellingMutex_);
    told_ = _permission();
  }
  profileChanges_ = store.observe([this](const DeviceProfile& before, const DeviceProfile& after) {
    _profileChanged(before, after);
  });
  settingChanges_ =
      settings.observe(kLocationAuthorizationKey, [this] { _permissionMayHaveChanged(); });
}

LinuxLocation::~LinuxLocation() {
  profileChanges_.reset();
  settingChanges_.reset();
  queue_->sync([] {});  // the providers of managers that have gone end
}

LinuxLocation::Permission LinuxLocation::_permission() const {
  const auto profile = store_.current();
  return {profile->locationServicesEnabled.value_or(true), authorizationOf(settings_, *profile)};
}

bool LinuxLocation::isEnabledSystemWide() const { return _permission().enabled; }

LocationAuthorization LinuxLocation::authorization(const std::string&) const {
  return _permission().status;
}

void LinuxLocation::setAuthorization(const std::string& bundlePath, LocationAuthorization status) {
  if (authorization(bundlePath) == status) return;
  settings_.set(kLocationAuthorizationKey, status);
}

std::unique_ptr<LocationManager> LinuxLocation::makeManager(
    const std::string&, const LocationOptions& options, std::weak_ptr<LocationDelegate> delegate,
    WorkQueue& queue) {
  const auto mayTell = [this] {
    const auto now = _permission();
    return now.enabled && now.status >= 3;
  };
  auto client = std::make_shared<LocationClient>(
      LocationClient::Host{store_, clock_, provider_, *queue_, mayTell}, options,
      std::move(delegate), queue);
  const MutexLock lock(clientsMutex_);
  clients_.push_back(client);
  return std::make_unique<Manager>(std::move(client));
}

std::vector<std::shared_ptr<LocationClient>> LinuxLocation::_liveClients() {
  std::vector<std::shared_ptr<LocationClient>> live;
  const MutexLock lock(clientsMutex_);
  std::erase_if(clients_, [&](const auto& weak) {
    const auto client = weak.lock();
    if (client) live.push_back(client);
    return !client;
  });
  return live;
}

void LinuxLocation::_permissionMayHaveChanged() {
  // One change at a time: what is told last is what counts.
  const MutexLock lock(tellingMutex_);
  const auto now = _permission();
  if (now == told_) return;
  told_ = now;
  for (const auto& client : _liveClients()) client->permissionChanged(now.status);
}

void LinuxLocation::_profileChanged(const DeviceProfile& before, const DeviceProfile& after) {
  _permissionMayHaveChanged();
  if (before.location == after.location) return;
  for (const auto& client : _liveClients()) client->profileMoved();
}

}  // namespace zelkord
