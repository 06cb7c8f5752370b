#include "zelkord/network/bag/ZelkorBagController.h"

#include <utility>

#include "base/Text.h"
#include "corezelkor/Constants.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/network/bag/BagFailureReason.h"
#include "zelkord/network/bag/BagFetchFeedback.h"
#include "zelkord/network/bag/BagFetchURL.h"
#include "zelkord/network/bag/BagRefreshRule.h"
#include "zelkord/network/bag/BagRequests.h"
#include "zelkord/network/bag/BagResponse.h"
#include "zelkord/network/exchange/RequestLogText.h"
#include "zelkord/network/exchange/ZLKRetryableNetworkRequest.h"

namespace zelkord {
namespace {

constexpr unsigned kBagFetchRetries = 5;

// How the news application sees a bag; the numbers are what the log says.
enum class NewsState : unsigned { Disabled = 0, Enabled = 1, Unknown = 2 };

NewsState newsState(const BagPointer& bag) {
  if (!bag) return NewsState::Unknown;
  return ZLKBag(bag->rawBag(), "news/1.0").isEnabled() ? NewsState::Enabled : NewsState::Disabled;
}

// The version as an installed bag with that value would tell it; none unless it is a number.
std::optional<std::string> reportedVersion(const json::object& response) {
  if (!numberIn(response, "bag")) return std::nullopt;
  auto bag = std::make_shared<json::object>();
  (*bag)["version"] = response.at("bag");
  auto version = ZLKBag(std::move(bag), std::nullopt).version();
  return version && !version->empty() ? std::move(version) : std::nullopt;
}

}  // namespace

// What a fetch keeps until it has ended.
struct ZelkorBagController::Fetch {
  Transaction transaction;
  std::shared_ptr<const std::string> cacheURL;  // that it began with
  BagFetchFeedback feedback;
  FetchCallback callback;
};

ZelkorBagController::ZelkorBagController(Assembly& assembly, BagRequests& requests)
    : assembly_(assembly),
      requests_(requests),
      disk_(assembly),
      userAgent_(zelkordUserAgent(assembly.platform().device)),
      cacheURL_(assembly, requests) {}

ZelkorBagController::~ZelkorBagController() = default;

void ZelkorBagController::start() {
  if (auto dictionary = diskCachedBagDictionary()) {
    cacheBagState(std::make_shared<const ZLKBag>(std::move(dictionary), userAgent_),
                  BagOrigin::Disk);
  }
  refreshRequired_ = assembly_.notificationCenter().observe(
      std::string(kZLKBagRefreshRequired),
      [weak = weak_from_this()](const Notification&) {
        if (const auto self = weak.lock()) self->_handleRefreshNotification();
      },
      &requests_);
}

std::string ZelkorBagController::bagFetchURLWithCountry(std::string_view country) const {
  auto chosen = bagFetchURL(assembly_.userDefaults(), country);
  if (chosen.settingIsMalformed) {
    assembly_.log(Category::Bag)
        .error("Malformed zelkor bag URL in user defaults key {}", kBagURLSetting);
  }
  return std::move(chosen.url);
}

BagPointer ZelkorBagController::currentBag() {
  auto bag = cachedBagState();
  if (!bag) _fetchBagStateWithVersion(std::nullopt);
  return bag;
}

BagPointer ZelkorBagController::cachedBagState() {
  auto bag = inMemoryBag();
  if (bag && (urlChangedMeanwhile_ || _isRefreshRequiredForCachedBag(bag->rawBag().get()))) {
    auto& queue = assembly_.platform().queues.global(QualityOfService::Default);
    queue.async([weak = weak_from_this()] {
      if (const auto self = weak.lock()) self->_fetchBagStateWithVersion(std::nullopt);
    });
  }
  return bag;
}

BagPointer ZelkorBagController::inMemoryBag() const { return assembly_.installedBag().get(); }

std::optional<std::string> ZelkorBagController::warmURL() {
  const auto bag = currentBag();
  return bag ? bag->warmURL() : std::nullopt;
}

BagFetchStatus ZelkorBagController::fetchStatus() {
  return {urlForPeople(*cacheURL_.get(*this, userAgent_)), lastFailure_.get(), _nextAttempt()};
}

std::optional<WallTime> ZelkorBagController::_nextAttempt() {
  const auto now = assembly_.platform().clock.wallNow();
  const auto bag = inMemoryBag();
  if (!bag || urlChangedMeanwhile_) return now;
  const auto url = cacheURL_.get(*this, userAgent_);
  const auto decision =
      decideBagRefresh(bag->rawBag().get(), now, [&] { return std::string_view(*url); });
  if (decision.reason == BagRefreshDecision::Reason::Disabled) return std::nullopt;
  if (decision.isRequired()) return now;
  return wallTimeOfSeconds(numberIn(*bag->rawBag(), kBagExpirationKey).value_or(0)) -
         kBagRefreshMargin;
}

void ZelkorBagController::forceFetchBag(const json::object& response) {
  const auto bag = inMemoryBag();
  const auto reported = reportedVersion(response);
  if (!reported) return;
  const auto current = bag ? bag->version() : std::nullopt;
  if (!current || compareNumerically(*current, *reported) < 0) _fetchBagStateWithVersion(reported);
}

void ZelkorBagController::cacheBagState(BagPointer bag, BagOrigin origin) {
  if (!bag) return;
  assembly_.installedBag().install(bag, origin, [&](const BagPointer& before) {
    if (origin == BagOrigin::Network) _tellNewsAvailability(before, bag);
  });
}

void ZelkorBagController::_tellNewsAvailability(const BagPointer& before,
                                                const BagPointer& bag) const {
  const auto newState = newsState(bag);
  if (newsState(before) == newState) return;
  assembly_.log(Category::Bag)
      .info("setting Zelkor News Available status to {}", static_cast<unsigned>(newState));
  assembly_.platform().systemNotifications.post(
      newState == NewsState::Enabled ? kZLKNotifyEnabled : kZLKNotifyDisabled);
}

std::shared_ptr<const json::object> ZelkorBagController::cacheBagDictionary(
    json::object dictionary, const std::string* fetchedUnder) {
  const auto url = cacheURL_.get(*this, userAgent_);
  auto cached =
      std::make_shared<const json::object>(_dictionaryToCacheBag(std::move(dictionary), *url));
  if (!fetchedUnder || *fetchedUnder == *url) disk_.write(*cached);
  return cached;
}

json::object ZelkorBagController::_dictionaryToCacheBag(json::object dictionary,
                                                        const std::string& url) {
  // The service cannot switch its own replacement off for ever.
  if (const auto* disabled = dictionary.find(kBagRefreshDisabledKey);
      disabled != dictionary.end()) {
    dictionary.stable_erase(disabled);
  }
  const auto now = assembly_.platform().clock.wallNow();
  dictionary[kBagExpirationKey] = secondsSince1970(now) + secondsOf(kBagLifetime);
  dictionary[kBagURLKey] = url;
  return dictionary;
}

std::shared_ptr<const json::object> ZelkorBagController::diskCachedBagDictionary() {
  auto dictionary = disk_.read();
  if (!dictionary) return nullptr;
  if (_isRefreshRequiredForCachedBag(&*dictionary)) _fetchBagStateWithVersion(std::nullopt);
  return std::make_shared<const json::object>(std::move(*dictionary));
}

bool ZelkorBagController::_isRefreshRequiredForCachedBag(const json::object* dictionary) {
  using Reason = BagRefreshDecision::Reason;
  const auto& log = assembly_.log(Category::Bag);
  std::shared_ptr<const std::string> url;
  const auto decision =
      decideBagRefresh(dictionary, assembly_.platform().clock.wallNow(), [this, &url] {
        url = cacheURL_.get(*this, userAgent_);
        return std::string_view(*url);
      });
  switch (decision.reason) {
    case Reason::Disabled:
      log.debug("Bag refresh is disabled.");
      break;
    case Reason::Expired:
      log.info("bag expired: {:f}", decision.remaining);
      assembly_.reporter().addValue(1, "com.quenta.zelkord.bag.expired");
      break;
    case Reason::URLChanged:
      if (log.isEnabled(LogLevel::Info)) {
        const bool shows = assembly_.platform().log.showsPrivateData();
        log.info("bag url changed from: {} to {}", urlForLog(decision.storedURL, shows),
                 urlForLog(*url, shows));
      }
      break;
    case Reason::NoURL:
      log.info("no bag URL found in cache");
      break;
    case Reason::UpToDate:
      break;
  }
  return decision.isRequired();
}

void ZelkorBagController::_handleRefreshNotification() {
  assembly_.log(Category::Bag)
      .info("something significant changed (locale, geo). checking to see if bag needs update");
  const auto bag = inMemoryBag();
  if (_isRefreshRequiredForCachedBag(bag ? bag->rawBag().get() : nullptr)) {
    _fetchBagStateWithVersion(std::nullopt);
  }
}

void ZelkorBagController::_fetchBagStateWithVersion(const std::optional<std::string>& version) {
  if (fetchInProgress_.exchange(true)) return;
  _fetchBagStateWithVersion(version, nullptr);
}

void ZelkorBagController::_fetchBagStateWithVersion(const std::optional<std::string>& version,
                                                    FetchCallback callback) {
  auto transaction = assembly_.platform().transactions.open("bagFetch");
  // Before the request is made: a change in between counts as one during the fetch.
  auto cacheURL = cacheURL_.get(*this, userAgent_);
  auto request = requests_.bagFetchRequest(*this, userAgent_, version);
  _logRequest(request);
  auto fetch = std::make_shared<Fetch>(Fetch{std::move(transaction), std::move(cacheURL),
                                             BagFetchFeedback(assembly_, request, userAgent_),
                                             std::move(callback)});
  _taskOf(std::move(request), std::move(fetch))->resume();
}

std::shared_ptr<URLTask> ZelkorBagController::_taskOf(URLRequest request,
                                                      std::shared_ptr<Fetch> fetch) {
  auto completion = [weak = weak_from_this(), log = assembly_.log(Category::Bag),
                     fetch = std::move(fetch)](const std::shared_ptr<URLTask>& task,
                                               const URLResult& result) {
    if (const auto self = weak.lock()) {
      self->_finishFetch(*fetch, *task, result);
    } else {
      log.error(
          "Error fetching bag, bag fetch task completed after BagFetchController was cleaned up");
    }
    fetch->transaction.reset();
  };
  const auto retryable = std::make_shared<const ZLKRetryableNetworkRequest>(
      ZLKRetryableNetworkRequest{std::move(request), std::nullopt, true});
  const auto& platform = assembly_.platform();
  return dataTaskWithRetryableRequest(assembly_.bagSession(), retryable, 1, kBagFetchRetries,
                                      std::move(completion), {platform.clock, platform.queues});
}

void ZelkorBagController::_finishFetch(Fetch& fetch, const URLTask& task, const URLResult& result) {
  _logResponse(result);
  fetch.feedback.recordEnd(result, task.timingData());
  auto response =
      readBagResponse(result, maximumBagSize(assembly_.userDefaults()),
                      assembly_.log(Category::Bag), assembly_.platform().log.showsPrivateData());
  BagPointer bag;
  if (response.dictionary) {
    bag = std::make_shared<const ZLKBag>(
        cacheBagDictionary(std::move(*response.dictionary), fetch.cacheURL.get()), userAgent_);
    cacheBagState(bag, BagOrigin::Network);
    assembly_.reporter().addValue(1, "com.quenta.zelkord.bag.fetches");
  } else {
    _failFetch(fetch, *response.error);
  }
  fetch.feedback.sessionComplete();
  if (fetch.callback) fetch.callback(bag, response.error);
  _endFetch(fetch, bag != nullptr);
}

void ZelkorBagController::_endFetch(const Fetch& fetch, bool succeeded) {
  // First let others begin one, then look: a change after this look has its own look at the bag.
  fetchInProgress_ = false;
  const bool changed = *cacheURL_.get(*this, userAgent_) != *fetch.cacheURL;
  if (changed || succeeded) urlChangedMeanwhile_ = changed;
  if (changed) _fetchBagStateWithVersion(std::nullopt);
}

void ZelkorBagController::_failFetch(Fetch& fetch, const Error& error) {
  fetch.feedback.recordError(error);
  lastFailure_.set({{assembly_.platform().clock.wallNow(), bagFailureReason(error)}});
  assembly_.installedBag().tellFailure(error);
  assembly_.reporter().addValue(1, "com.quenta.zelkord.bag.fetchesfailed");
}

void ZelkorBagController::_logRequest(const URLRequest& request) const {
  const auto& log = assembly_.log(Category::Bag);
  if (!log.isEnabled(LogLevel::Info)) return;
  const auto url = urlForLog(request.url, assembly_.platform().log.showsPrivateData());
  log.info("Initiating bag fetch attempt with request {} header {}", url,
           priv(headersForLog(request.headers)));
}

void ZelkorBagController::_logResponse(const URLResult& result) const {
  const auto& log = assembly_.log(Category::Bag);
  if (!log.isEnabled(LogLevel::Debug)) return;
  log.debug("resp: {}",
            responseForLog(result.response, assembly_.platform().log.showsPrivateData()));
}

}  // namespace zelkord
