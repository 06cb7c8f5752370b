#include "platform/testing/FakeLocation.h"

#include <algorithm>

namespace zelkord {

// One manager's side of the shared state.
struct FakeLocationClient {
  std::weak_ptr<LocationDelegate> delegate;
  WorkQueue* queue = nullptr;
  bool updating = false;
};

struct FakeLocation::State {
  mutable Mutex mutex;
  bool enabled ZK_GUARDED_BY(mutex) = true;
  int starts ZK_GUARDED_BY(mutex) = 0;
  std::map<std::string, LocationAuthorization> authorizations ZK_GUARDED_BY(mutex);
  std::vector<std::weak_ptr<FakeLocationClient>> clients ZK_GUARDED_BY(mutex);
  std::vector<LocationOptions> options ZK_GUARDED_BY(mutex);

  int count(bool onlyUpdating) const {
    const MutexLock lock(mutex);
    return static_cast<int>(std::count_if(clients.begin(), clients.end(), [&](const auto& weak) {
      const auto client = weak.lock();
      return client && (client->updating || !onlyUpdating);
    }));
  }
};

namespace {

class FakeLocationManager final : public LocationManager {
 public:
  FakeLocationManager(std::shared_ptr<FakeLocation::State> state,
                      std::shared_ptr<FakeLocationClient> client)
      : state_(std::move(state)), client_(std::move(client)) {}

  void startUpdating() override {
    const MutexLock lock(state_->mutex);
    client_->updating = true;
    ++state_->starts;
  }
  void stopUpdating() override {
    const MutexLock lock(state_->mutex);
    client_->updating = false;
  }

 private:
  const std::shared_ptr<FakeLocation::State> state_;
  const std::shared_ptr<FakeLocationClient> client_;
};

}  // namespace

FakeLocation::FakeLocation() : state_(std::make_shared<State>()) {}
FakeLocation::~FakeLocation() = default;

bool FakeLocation::isEnabledSystemWide() const {
  const MutexLock lock(state_->mutex);
  return state_->enabled;
}

LocationAuthorization FakeLocation::authorization(const std::string& bundlePath) const {
  const MutexLock lock(state_->mutex);
  const auto found = state_->authorizations.find(bundlePath);
  return found == state_->authorizations.end() ? 0 : found->second;
}

void FakeLocation::setAuthorization(const std::string& bundlePath, LocationAuthorization status) {
  if (authorization(bundlePath) != status) changeAuthorization(bundlePath, status);
}

std::unique_ptr<LocationManager> FakeLocation::makeManager(const std::string&,
                                                           const LocationOptions& options,
                                                           std::weak_ptr<LocationDelegate> delegate,
                                                           WorkQueue& queue) {
  auto client = std::make_shared<FakeLocationClient>();
  client->delegate = std::move(delegate);
  client->queue = &queue;
  const MutexLock lock(state_->mutex);
  state_->clients.push_back(client);
  state_->options.push_back(options);
  return std::make_unique<FakeLocationManager>(state_, std::move(client));
}

void FakeLocation::setEnabledSystemWide(bool enabled) {
  const MutexLock lock(state_->mutex);
  state_->enabled = enabled;
}

void FakeLocation::_tell(bool onlyUpdating, std::function<void(LocationDelegate&)> event) {
  const MutexLock lock(state_->mutex);
  for (const auto& weak : state_->clients) {
    const auto client = weak.lock();
    if (!client || (onlyUpdating && !client->updating)) continue;
    client->queue->async([weak, event] {
      const auto alive = weak.lock();
      const auto delegate = alive ? alive->delegate.lock() : nullptr;
      if (delegate) event(*delegate);
    });
  }
}

void FakeLocation::deliver(std::vector<LocationFix> fixes) {
  _tell(true, [fixes = std::move(fixes)](LocationDelegate& to) { to.didUpdateLocations(fixes); });
}

void FakeLocation::fail(Error error) {
  _tell(true, [error = std::move(error)](LocationDelegate& to) { to.didFailWithError(error); });
}

void FakeLocation::changeAuthorization(const std::string& bundlePath,
                                       LocationAuthorization status) {
  {
    const MutexLock lock(state_->mutex);
    state_->authorizations[bundlePath] = status;
  }
  _tell(false, [status](LocationDelegate& to) { to.didChangeAuthorizationStatus(status); });
}

int FakeLocation::managers() const { return state_->count(false); }
int FakeLocation::updating() const { return state_->count(true); }

int FakeLocation::starts() const {
  const MutexLock lock(state_->mutex);
  return state_->starts;
}

std::vector<LocationOptions> FakeLocation::options() const {
  const MutexLock lock(state_->mutex);
  return state_->options;
}

}  // namespace zelkord
