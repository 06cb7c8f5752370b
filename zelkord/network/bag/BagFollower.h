#pragma once

#include <atomic>
#include <memory>

#include "base/Subscription.h"
#include "zelkord/assembly/InstalledBag.h"
#include "zelkord/network/context/RequestContextStore.h"

namespace zelkord {

class Assembly;
class LocationController;
class VisibilityRestrictions;

// Carries what the bag in force says into the request context and to the host: the sources of
// location it allows, visibility restrictions, the routing proxy's configuration.
//
// Threading: `start` once, on any thread; bags come on the thread of whoever installs them.
// Ownership: the assembly outlives it.
class BagFollower final : public std::enable_shared_from_this<BagFollower> {
 public:
  BagFollower(Assembly& assembly, std::shared_ptr<RequestContextStore> context,
              std::shared_ptr<LocationController> location);
  ~BagFollower();

  void start();

 private:
  void _didGetBag(const BagPointer& bag);

  // Fixed after construction; the observation after start.
  Assembly& assembly_;
  const std::shared_ptr<RequestContextStore> context_;
  const std::shared_ptr<LocationController> location_;
  const std::shared_ptr<VisibilityRestrictions> restrictions_;
  Subscription observation_;

  // Own synchronisation.
  std::atomic<bool> locationIsSetUp_ = false;
};

}  // namespace zelkord
