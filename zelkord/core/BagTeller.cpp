#include "zelkord/core/BagTeller.h"

#include "corezelkor/Constants.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/core/Wire.h"
#include "zelkord/network/RequestLogText.h"
#include "zelkord/network/ZelkorBagController.h"

namespace zelkord {
BagTeller::BagTeller(Assembly& assembly, std::shared_ptr<ipc::Connection> connection)
    : assembly_(assembly), connection_(std::move(connection)) {}

BagTeller::~BagTeller() = default;

void BagTeller::clientConfigured(std::shared_ptr<ClientState> state,
                                 std::optional<std::string> userAgent) {
  state_.set(std::move(state));
  userAgent_.set(std::move(userAgent));
  if (deliveriesWanted_++ > 0) return;
  assembly_.platform().queues.global(QualityOfService::Default).async([weak = weak_from_this()] {
    if (const auto self = weak.lock()) self->_deliverAsOftenAsWanted();
  });
}

void BagTeller::end() {
  Subscription released;
  const MutexLock lock(mutex_);
  ended_ = true;
  released = std::move(observation_);
}

bool BagTeller::_hasEnded() const {
  const MutexLock lock(mutex_);
  return ended_;
}

void BagTeller::_deliverAsOftenAsWanted() {
  for (unsigned wanted = deliveriesWanted_; wanted > 0 && !_hasEnded();) {
    _deliver();
    wanted = deliveriesWanted_.fetch_sub(wanted) - wanted;
  }
}

void BagTeller::_deliver() {
  const auto state = state_.get();
  state->bag(userAgent_.get(), [this, &state](const auto& bag, const auto& error) {
    if (_hasEnded()) return;
    _logDelivery(*state, bag.get(), error);
    const MutexLock lock(mutex_);
    _tell(bag.get(), error);
  });
  if (_hasEnded()) return;
  _observeChanges();
  _catchUp();
  assembly_.clientStateManager()->saveState();
}

void BagTeller::_logDelivery(const ClientState& state, const ZLKBag* bag,
                             const std::optional<Error>& error) const {
  if (bag && !bag->feedbackEnabled()) {
    assembly_.log(Category::Feedback)
        .info("feedback collection disabled in bag for user agent {}", orNull(bag->userAgent()));
  }
  assembly_.log(Category::Bag)
      .info("sending bag with version: {} to client: {} error: {}",
            bag ? orNull(bag->version()) : "(null)", state.identifier(),
            error ? error->description() : "(null)");
}

void BagTeller::_observeChanges() {
  const MutexLock lock(mutex_);
  if (observation_ || ended_) return;
  observation_ =
      assembly_.notificationCenter().observe(std::string(kZLKBagChangeNotification),
                                             [weak = weak_from_this()](const Notification& posted) {
                                               if (const auto self = weak.lock())
                                                 self->_bagChangeNotification(posted);
                                             });
}

// Tells the bag that was installed after the one at hand was read, when no notification has told
// it: the first comes before the observation, a later one may be overtaken by the delivery.
void BagTeller::_catchUp() {
  unsigned changes = 0;
  {
    const MutexLock lock(mutex_);
    changes = changes_;
  }
  // Without the lock: it waits for an installation under way, and that tells under the lock.
  const auto bag = assembly_.bagController()->inMemoryBag();
  const MutexLock lock(mutex_);
  if (bag && changes_ == changes && bag->rawBag() != told_) _tell(bag.get(), std::nullopt);
}

void BagTeller::_bagChangeNotification(const Notification& notification) {
  const auto* posted = notification.value<std::shared_ptr<const ZLKBag>>("bag");
  const auto* bag = posted ? posted->get() : nullptr;
  const auto& log = assembly_.log(Category::Bag);
  if (log.isEnabled(LogLevel::Info)) {
    const bool show = assembly_.platform().log.showsPrivateData();
    log.info("bag change notification: {}", bag ? bagForLog(*bag->rawBag(), show) : "(null)");
  }
  if (!bag) return;
  const MutexLock lock(mutex_);
  ++changes_;
  _tell(bag, std::nullopt);
}

void BagTeller::_tell(const ZLKBag* bag, const std::optional<Error>& error) {
  if (ended_) return;
  told_ = bag ? bag->rawBag() : nullptr;
  connection_->callClient(
      kClientObjectPath, kClientInterface, "BagDidLoad", "a{sv}a{sv}",
      {encodeBag(bag), encodeError(error)},
      [&assembly = assembly_, pid = connection_->peer().pid](const Error& failure) {
        assembly.log(Category::Connection)
            .error("(pid:{}) remote proxy error: {}", pid, failure.description());
      });
}

}  // namespace zelkord
