#include "platform/linux/location/LocationClient.h"

#include <utility>

namespace zelkord {
namespace {

LocationFix fixOfProfile(const DeviceProfile::Location& location, const Clock& clock) {
  return {location.latitude, location.longitude, location.horizontalAccuracy, location.type,
          clock.now() - durationOfSeconds(location.age)};
}

}  // namespace

LocationClient::LocationClient(Host host, const LocationOptions& options,
                               std::weak_ptr<LocationDelegate> delegate, WorkQueue& delegateQueue)
    : host_(std::move(host)),
      options_(options),
      delegate_(std::move(delegate)),
      delegateQueue_(delegateQueue),
      queue_(host_.queue) {}

void LocationClient::start() {
  _enqueue([](LocationClient& self) {
    self.queue_.assertCurrent();
    self.updating_ = true;
    self.askedSinceAttempt_ = true;
    self._update();
  });
}

void LocationClient::stop() {
  // Not given up when the manager goes meanwhile: a provider may run.
  queue_.async([self = shared_from_this()] {
    self->queue_.assertCurrent();
    self->updating_ = false;
    self->_endProvider();
  });
}

void LocationClient::close() {
  closed_ = true;
  stop();
}

void LocationClient::profileMoved() {
  _enqueue([](LocationClient& self) { self._update(); });
}

void LocationClient::permissionChanged(LocationAuthorization status) {
  _tell([status](LocationDelegate& to) { to.didChangeAuthorizationStatus(status); });
  _enqueue([](LocationClient& self) { self._update(); });
}

void LocationClient::_update() {
  queue_.assertCurrent();
  if (!updating_) return;
  const auto profile = host_.store.current();
  if (!host_.mayTell()) {
    _endProvider();
  } else if (profile->location) {
    _endProvider();
    _tellFix(fixOfProfile(*profile->location, host_.clock));
  } else {
    _tryProvider();
  }
}

void LocationClient::_tryProvider() {
  queue_.assertCurrent();
  if (source_ || retry_) return;
  const auto now = host_.clock.now();
  if (now < nextAttempt_) {
    if (!askedSinceAttempt_) return;
    retry_ = queue_.after(nextAttempt_ - now, [weak = weak_from_this()] {
      const auto self = weak.lock();
      if (!self) return;
      self->queue_.assertCurrent();
      self->retry_.reset();
      self->_update();
    });
    return;
  }
  askedSinceAttempt_ = false;
  const auto attempt = ++attempt_;
  source_ = host_.provider ? host_.provider(options_, _eventsOf(attempt)) : nullptr;
  if (!source_) _providerEnded(attempt);
}

void LocationClient::_endProvider() {
  queue_.assertCurrent();
  askedSinceAttempt_ = false;
  retry_.reset();
  source_.reset();
}

void LocationClient::_providerEnded(std::uint64_t attempt) {
  queue_.assertCurrent();
  if (attempt != attempt_) return;
  source_.reset();
  nextAttempt_ = host_.clock.now() + kProviderRetry;
  if (askedSinceAttempt_) _update();
}

void LocationClient::_gotFix(std::uint64_t attempt, const LocationFix& fix) {
  queue_.assertCurrent();
  if (source_ && attempt == attempt_) _tellFix(fix);
}

void LocationClient::_failed(std::uint64_t attempt, const Error& error) {
  queue_.assertCurrent();
  if (!source_ || attempt != attempt_) return;
  _tell([error](LocationDelegate& to) { to.didFailWithError(error); });
}

// None of them takes a reference on the provider's own thread: the last one would have the provider
// wait for itself.
LocationSourceEvents LocationClient::_eventsOf(std::uint64_t attempt) {
  const auto onQueue = [&queue = queue_, weak = weak_from_this()](auto event) {
    queue.async([weak, event = std::move(event)] {
      if (const auto self = weak.lock()) event(*self);
    });
  };
  LocationSourceEvents events;
  events.fix = [onQueue, attempt](const LocationFix& fix) {
    onQueue([attempt, fix](LocationClient& self) { self._gotFix(attempt, fix); });
  };
  events.failure = [onQueue, attempt](const Error& error) {
    onQueue([attempt, error](LocationClient& self) { self._failed(attempt, error); });
  };
  events.ended = [onQueue, attempt] {
    onQueue([attempt](LocationClient& self) { self._providerEnded(attempt); });
  };
  return events;
}

void LocationClient::_enqueue(std::function<void(LocationClient&)> task) {
  queue_.async([weak = weak_from_this(), task = std::move(task)] {
    if (const auto self = weak.lock()) task(*self);
  });
}

void LocationClient::_tellFix(const LocationFix& fix) {
  delegateQueue_.async([weak = weak_from_this(), fix] {
    const auto self = weak.lock();
    const auto delegate = self && !self->closed_ ? self->delegate_.lock() : nullptr;
    // A refusal may have come while this waited, and must not be followed by a fix.
    if (delegate && self->host_.mayTell()) delegate->didUpdateLocations({fix});
  });
}

void LocationClient::_tell(std::function<void(LocationDelegate&)> event) {
  delegateQueue_.async([weak = weak_from_this(), event = std::move(event)] {
    const auto self = weak.lock();
    const auto delegate = self && !self->closed_ ? self->delegate_.lock() : nullptr;
    if (delegate) event(*delegate);
  });
}

}  // namespace zelkord
