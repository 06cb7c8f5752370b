#include "zelkord/network/bag/BagFollower.h"

#include <utility>

#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/context/LocationController.h"
#include "zelkord/network/context/VisibilityRestrictions.h"

namespace zelkord {

BagFollower::BagFollower(Assembly& assembly, std::shared_ptr<RequestContextStore> context,
                         std::shared_ptr<LocationController> location)
    : assembly_(assembly),
      context_(std::move(context)),
      location_(std::move(location)),
      restrictions_(std::make_shared<VisibilityRestrictions>(assembly)) {}

BagFollower::~BagFollower() = default;

void BagFollower::start() {
  observation_ =
      assembly_.installedBag().observe([weak = weak_from_this()](BagNews, const BagPointer& bag) {
        const auto self = weak.lock();
        if (self && bag) self->_didGetBag(bag);
      });
}

void BagFollower::_didGetBag(const BagPointer& bag) {
  const auto sources = bag->supportedGeoLocationSources();
  context_->update(
      [sources](RequestContext& context) { context.location.supportedSources = sources; });
  if (!locationIsSetUp_.exchange(true)) location_->setupLocationServices(!sources.empty());
  restrictions_->update(bag);
  assembly_.platform().networkProxy.setConfiguration(bag->morvaneConfiguration(), "zelkord");
}

}  // namespace zelkord
