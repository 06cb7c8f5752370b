#include "zelkord/core/BagTeller.h"

#include "corezelkor/Constants.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/core/Wire.h"
#include "zelkord/network/exchange/RequestLogText.h"

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

bool BagTeller::_isObserving() const {
  const MutexLock lock(mutex_);
  return static_cast<bool>(observation_);
}

void BagTeller::_deliverAsOftenAsWanted() {
  for (unsigned wanted = deliveriesWanted_; wanted > 0 && !_hasEnded();) {
    _deliver();
    wanted = deliveriesWanted_.fetch_sub(wanted) - wanted;
  }
}

void BagTeller::_deliver() {
  const auto state = state_.get();
  state->bag(userAgent_.get(), [this, &state](const BagPointer& bag, const auto& error) {
    const MutexLock lock(mutex_);
    if (ended_) return;
    // What has been told is in force, since changes are told; what the state had may be older.
    const auto view = told_ ? assembly_.installedBag().seenBy(told_, state->userAgent()) : bag;
    _logDelivery(*state, view.get(), view ? std::nullopt : error);
    _tell(view, view ? std::nullopt : error);
  });
  if (_hasEnded()) return;
  _observeBag();
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

// Deliveries, which begin it, come one after the other.
void BagTeller::_observeBag() {
  if (_isObserving()) return;
  // Without the lock: it waits for an installation under way, and that tells under the lock.
  auto observation = assembly_.installedBag().observe(
      [weak = weak_from_this()](BagNews news, const BagPointer& bag) {
        if (const auto self = weak.lock()) self->_bagChangeNotification(news, bag);
      });
  const MutexLock lock(mutex_);
  if (!ended_) observation_ = std::move(observation);
}

void BagTeller::_bagChangeNotification(BagNews news, const BagPointer& bag) {
  if (news != BagNews::Present) _logChange(bag.get());
  if (!bag) return;
  const MutexLock lock(mutex_);
  if (news == BagNews::Present && told_ && told_->rawBag() == bag->rawBag()) return;
  _tell(bag, std::nullopt);
}

void BagTeller::_logChange(const ZLKBag* bag) const {
  const auto& log = assembly_.log(Category::Bag);
  if (!log.isEnabled(LogLevel::Info)) return;
  const bool show = assembly_.platform().log.showsPrivateData();
  log.info("bag change notification: {}", bag ? bagForLog(*bag->rawBag(), show) : "(null)");
}

void BagTeller::_tell(const BagPointer& bag, const std::optional<Error>& error) {
  if (ended_) return;
  told_ = bag;
  connection_->callClient(
      kClientObjectPath, kClientInterface, "BagDidLoad", "a{sv}a{sv}",
      {encodeBag(bag.get()), encodeError(error)},
      [&assembly = assembly_, pid = connection_->peer().pid](const Error& failure) {
        assembly.log(Category::Connection)
            .error("(pid:{}) remote proxy error: {}", pid, failure.description());
      });
}

}  // namespace zelkord
