#include "zelkord/query/ClientState.h"

#include <algorithm>

#include "base/Text.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/ClientShortName.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/context/ZelkorUserGUIDController.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"
#include "zelkord/query/ErrorCodes.h"
#include "zelkord/query/QueryCache.h"
#include "zelkord/query/WarmUp.h"

namespace zelkord {
namespace {

constexpr Duration kBagWait = 1s;
constexpr Duration kConnectionStaysWarm = 30s;

}  // namespace

ClientState::ClientState(std::string identifier, Assembly& assembly,
                         std::shared_ptr<ClientBudgets> budgets)
    : assembly_(assembly),
      identifier_(std::move(identifier)),
      clientShortName_(zelkord::clientShortName(identifier_)),
      budgets_(std::move(budgets)),
      bagFetchSemaphore_(assembly.platform().queues.makeSemaphore(0)) {
  if (boolSetting(assembly.userDefaults(), "ZLKNoQueryCache")) {
    assembly.log(Category::Caching).info("query cache OFF for {}", identifier_);
  } else {
    queryCache_ = std::make_shared<QueryCache>(
        assembly, budgets_ ? std::shared_ptr<Budget>(budgets_, &budgets_->cacheBytes) : nullptr);
    queryCache_->start();
    assembly.log(Category::Caching).debug("query cache ON for {}", identifier_);
  }
  const auto& session = assembly.log(Category::Session);
  if (!assembly.sharedSession() || !assembly.guidController() || !assembly.clientSessionManager()) {
    session.info("Zelkor is using individual instance of guid controller {}", identifier_);
    ownGuidController_ = std::make_shared<ZelkorUserGUIDController>(assembly);
    ownSessionManager_ = assembly.feedbackSessions()->makeManager(identifier_, ownGuidController_);
  } else {
    session.info("Zelkor is using shared instance of guid controller");
  }
  guidController_ = ownGuidController_ ? ownGuidController_.get() : assembly.guidController();
  sessionManager_ = ownSessionManager_ ? ownSessionManager_.get() : assembly.clientSessionManager();
}

ClientState::~ClientState() = default;

void ClientState::setProcess(std::int64_t process) {
  process_ = process;
  if (queryCache_) queryCache_->setHolder(processHolder(process));
}

std::optional<std::string> ClientState::userAgent() const {
  const MutexLock lock(viewMutex_);
  return userAgent_;
}

void ClientState::setUserAgent(std::optional<std::string> userAgent) {
  const MutexLock lock(viewMutex_);
  userAgent_ = std::move(userAgent);
}

BagPointer ClientState::currentBag() const {
  const MutexLock lock(viewMutex_);
  return bag_;
}

void ClientState::adoptUserAgent(const std::optional<std::string>& userAgent) {
  if (!userAgent || userAgent->empty()) return;
  {
    const MutexLock lock(viewMutex_);
    if (userAgent == userAgent_) return;
    userAgent_ = userAgent;
    bag_ = assembly_.installedBag().seenBy(bag_, userAgent_);
  }
  if (queryCache_) queryCache_->removeAllObjects();
}

void ClientState::bag(const std::optional<std::string>& userAgent, const BagCallback& reply) {
  adoptUserAgent(userAgent);
  if (!this->userAgent()) {
    reply(nullptr, zelkorError(kBagFault, "no UserAgent"));
  } else if (_ensureBag()) {
    reply(currentBag(), std::nullopt);
  } else {
    reply(nullptr, zelkorError(kBagFault, "timeout"));
  }
}

bool ClientState::_ensureBag() {
  const auto userAgent = this->userAgent();
  if (!userAgent) return false;
  if (currentBag()) return true;
  _observeBag();
  assembly_.log(Category::Caching).info("Warming bag cache for agent: {}", *userAgent);
  // What the controller has, the observation has told.
  if (assembly_.bagController()->currentBag()) return true;
  _markNetworkRequest();
  _waitForBag();
  return currentBag() != nullptr;
}

void ClientState::_waitForBag() {
  const auto share = budgets_ ? budgets_->bagWaits.take(processHolder(process()))
                              : std::make_optional<Budget::Share>();
  if (!share) return;
  // Counted before the last look at the bag, so that a change after it raises the semaphore for
  // this thread too.
  ++bagWaiters_;
  if (!currentBag()) bagFetchSemaphore_->wait(kBagWait);
  --bagWaiters_;
}

void ClientState::_observeBag() {
  const MutexLock lock(observationMutex_);
  if (bagObservation_) return;
  bagObservation_ = assembly_.installedBag().observe(
      [weak = weak_from_this()](BagNews news, const BagPointer& bag) {
        if (const auto self = weak.lock()) self->_bagChangeNotification(news, bag);
      });
}

void ClientState::_bagChangeNotification(BagNews news, const BagPointer& bag) {
  if (bag) {
    const MutexLock lock(viewMutex_);
    bag_ = assembly_.installedBag().seenBy(bag, userAgent_);
  }
  if (news != BagNews::Present) bagFetchSemaphore_->signal(std::max(1u, bagWaiters_.load()));
}

void ClientState::warm() {
  const auto& log = assembly_.log(Category::Search);
  const auto url = assembly_.bagController()->warmURL();
  if (!url) {
    log.debug("warm not required, bag fetch in process");
    return;
  }
  const auto last = lastNetworkRequest_.get();
  if (last && assembly_.platform().clock.now() - *last < kConnectionStaysWarm) {
    log.debug("warm not required, connection still warm");
    return;
  }
  sendWarmRequest(assembly_, *url);
  _markNetworkRequest();
}

void ClientState::_markNetworkRequest() {
  lastNetworkRequest_.set(assembly_.platform().clock.now());
}

void ClientState::_setPerformedSearch() { assembly_.requestFactory()->setPerformedSearch(); }

void ClientState::count(std::string_view suffix) const {
  if (clientShortName_) assembly_.reporter().addValue(1, createAggdKey(*clientShortName_, suffix));
}

void ClientState::recordSearchResult(int statusCode) const {
  count("fedapicall.serverstatus." + std::to_string(statusCode));
}

FieldMask ClientState::fieldMask() const {
  const auto userAgent = this->userAgent();
  return userAgent && containsIgnoringCase(*userAgent, "messages") ? kFieldMaskWithholdLocation
                                                                   : kFieldMaskNone;
}

void ClientState::record(std::shared_ptr<const HVFeedback> feedback, const ZLKRequest& request,
                         std::optional<UUID> userGuid) const {
  sessionManager_->addZelkorFeedback({std::move(feedback), request.queryId, userGuid, userAgent(),
                                      request.clientQueryId, 0, process()});
}

}  // namespace zelkord
