#include "zelkord/network/context/LocationController.h"

#include <utility>

#include "zelkord/assembly/Assembly.h"

namespace zelkord {
namespace {

constexpr LocationAuthorization kNotDetermined = 0;
constexpr LocationAuthorization kGranted = 4;

bool isRefused(LocationAuthorization status) { return status == 1 || status == 2; }
bool isAuthorized(LocationAuthorization status) { return status == 3 || status == 4; }

// Typing makes a request every few moments; asking again would only wake a thread for nothing.
constexpr Duration kShortestBetweenAsks = 1s;

std::string locationBundle() { return std::string(kLocationBundlePath); }

}  // namespace

LocationController::LocationController(Assembly& assembly,
                                       std::shared_ptr<RequestContextStore> context)
    : assembly_(assembly),
      context_(std::move(context)),
      locationQueue_(assembly.platform().queues.makeSerialQueue(
          "com.quenta.zelkord.contextparametercontroller.locationqueue")) {}

void LocationController::initLocationServices() {
  auto& service = assembly_.platform().location;
  const auto status = service.authorization(locationBundle());
  if (status == kNotDetermined) service.setAuthorization(locationBundle(), kGranted);
  // By the status before the grant: the first start of all begins without the user's word.
  context_->update([reason = isAuthorized(status) ? kNoFixYet : kUserSaidNo](RequestContext& c) {
    c.location.source = reason;
  });
}

void LocationController::setupLocationServices(bool anySourceAllowed) {
  locationQueue_->async([weak = weak_from_this(), anySourceAllowed] {
    if (const auto self = weak.lock()) self->_setupLocationServices(anySourceAllowed);
  });
}

void LocationController::_setupLocationServices(bool anySourceAllowed) {
  locationQueue_->assertCurrent();
  if (!anySourceAllowed) {
    _dropManager();
    _setNoLocationWithReason(kBagSaidNoToAll);
    return;
  }
  assembly_.platform().queues.main().async([weak = weak_from_this()] {
    if (const auto self = weak.lock()) self->_makeManager();
  });
}

void LocationController::_makeManager() {
  auto& platform = assembly_.platform();
  platform.queues.main().assertCurrent();
  if (!manager_.get()) {
    const LocationOptions options{.desiredAccuracy = 1000, .dynamicAccuracyReduction = true};
    manager_.set(platform.location.makeManager(locationBundle(), options, weak_from_this(),
                                               platform.queues.main()));
    context_->update([](RequestContext& c) { c.location.hasManager = true; });
  }
  if (isRefused(platform.location.authorization(locationBundle()))) {
    _setNoLocationWithReason(kUserSaidNo);
  } else {
    _startManager();
  }
}

void LocationController::_dropManager() {
  locationQueue_->assertCurrent();
  if (const auto manager = manager_.get()) manager->stopUpdating();
  manager_.set(nullptr);
  context_->update([](RequestContext& c) { c.location.hasManager = false; });
}

void LocationController::startUpdatingLocation() {
  auto need = LocationNeed::Nothing;
  context_->updateNow([&](RequestContext& c) {
    need = c.location.need(assembly_.platform().clock.now());
    if (need == LocationNeed::MarkSlowAndAsk) c.location.setNoLocationWithReason(kFixIsSlow);
  });
  if (need != LocationNeed::Nothing) askForFix();
}

void LocationController::askForFix() {
  const auto now = assembly_.platform().clock.now();
  if (now < nextAsk_.load()) return;
  nextAsk_ = now + kShortestBetweenAsks;
  _startManager();
}

void LocationController::_startManager() { _onManager(&LocationManager::startUpdating); }
void LocationController::_stopUpdatingLocation() { _onManager(&LocationManager::stopUpdating); }

void LocationController::_onManager(void (LocationManager::*operation)()) {
  locationQueue_->async([weak = weak_from_this(), operation] {
    const auto self = weak.lock();
    const auto manager = self ? self->manager_.get() : nullptr;
    if (manager) (*manager.*operation)();
  });
}

void LocationController::didUpdateLocations(const std::vector<LocationFix>& fixes) {
  if (fixes.empty()) return;
  context_->update([weak = weak_from_this(), fix = fixes.back()](RequestContext& c) {
    const auto self = weak.lock();
    if (c.location.setLocationIfAllowedByBag(fix) && self) self->_stopUpdatingLocation();
  });
}

void LocationController::didChangeAuthorizationStatus(LocationAuthorization status) {
  if (assembly_.platform().location.isEnabledSystemWide() && isAuthorized(status)) {
    _startManager();
  } else {
    _setNoLocationWithReason(kUserSaidNo);
  }
}

void LocationController::didFailWithError(const Error& error) {
  assembly_.log(Category::Request)
      .error("Location determination failed with error {}", error.description());
  _setNoLocationWithReason(kLocationFailed);
}

void LocationController::_setNoLocationWithReason(std::string_view reason) {
  context_->update([reason = std::string(reason)](RequestContext& c) {
    c.location.setNoLocationWithReason(reason);
  });
}

}  // namespace zelkord
