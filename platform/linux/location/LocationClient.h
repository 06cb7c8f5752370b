#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>

#include "platform/api/Clock.h"
#include "platform/api/LocationService.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/device_profile/DeviceProfileStore.h"
#include "platform/linux/location/LocationSource.h"

namespace zelkord {

// How long a provider that has ended is left alone: location is wanted with every search, and each
// attempt costs a connection.
inline constexpr Duration kProviderRetry = 300s;

// The inside of a location manager, which it may outlive for as long as a task of it waits.
//
// States: resting; updating by the profile's location; updating with a provider that runs; updating
// after a provider has ended: it is tried again `kProviderRetry` later if somebody has asked since
// the attempt began, else when somebody does.
//
// Threading: any thread; all state belongs to the queue of the location service.
// Ownership: everything in `Host` outlives it, and so does the delegate's queue.
class LocationClient final : public std::enable_shared_from_this<LocationClient> {
 public:
  // What the location service lends to its clients.
  struct Host {
    const DeviceProfileStore& store;
    const Clock& clock;
    const LocationSourceFactory& provider;
    SerialQueue& queue;
    std::function<bool()> mayTell;
  };

  LocationClient(Host host, const LocationOptions& options,
                 std::weak_ptr<LocationDelegate> delegate, WorkQueue& delegateQueue);

  void start();
  void stop();
  // The manager has gone: the delegate hears nothing any more.
  void close();
  // The profile's location is another one.
  void profileMoved();
  // Tells the delegate; providers begin and end with it.
  void permissionChanged(LocationAuthorization status);

 private:
  void _update();
  void _tryProvider();
  void _endProvider();
  void _providerEnded(std::uint64_t attempt);
  void _gotFix(std::uint64_t attempt, const LocationFix& fix);
  void _failed(std::uint64_t attempt, const Error& error);
  LocationSourceEvents _eventsOf(std::uint64_t attempt);
  // Runs `task` on the service's queue, unless this has gone by then.
  void _enqueue(std::function<void(LocationClient&)> task);
  void _tellFix(const LocationFix& fix);
  void _tell(std::function<void(LocationDelegate&)> event);

  // Fixed after construction.
  const Host host_;
  const LocationOptions options_;
  const std::weak_ptr<LocationDelegate> delegate_;
  WorkQueue& delegateQueue_;
  SerialQueue& queue_;

  // Own synchronisation.
  std::atomic<bool> closed_ = false;

  // Queue state.
  bool updating_ ZK_ON(queue_) = false;
  bool askedSinceAttempt_ ZK_ON(queue_) = false;
  std::uint64_t attempt_ ZK_ON(queue_) = 0;
  std::unique_ptr<LocationSource> source_ ZK_ON(queue_);  // of the attempt; null: it has ended
  SteadyTime nextAttempt_ ZK_ON(queue_) = SteadyTime::min();
  Subscription retry_ ZK_ON(queue_);
};

}  // namespace zelkord
