#include "zelkord/query/QueryCache.h"

#include <limits>

#include "base/Text.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/NotificationNames.h"

namespace zelkord {
namespace {

constexpr std::uint64_t kCacheLimit = 2'097'152;  // bytes
constexpr std::uint64_t kEntrySurcharge = 1'024;

constexpr std::string_view kClearingNotifications[] = {kZLKUserGUIDChangeNotification,
                                                       kZLKSessionSoftLimitNotification,
                                                       kZLKSessionMaxLimitNotification,
                                                       kCountryCodeChanged,
                                                       kTimeZoneChanged,
                                                       kCurrentLocaleChanged,
                                                       kEffectiveRestrictionsChanged};

// The shortest completions among the entries of one walk, in its order.
class ShortestCompletions {
 public:
  ShortestCompletions(std::size_t textLength, double scale, const UUID& userGuid)
      : textLength_(textLength), scale_(scale), userGuid_(userGuid) {}

  void consider(const CachedResultSet& entry) {
    if (entry.queryLength() > shortest_) return;
    if (scale_ > 0 && scale_ != entry.uiScale()) return;
    if (textLength_ < entry.inputLength()) return;
    if (userGuid_ != entry.userGuid()) return;
    if (entry.queryLength() < shortest_) entries_.clear();
    shortest_ = entry.queryLength();
    entries_.push_back(&entry);
  }

  const std::vector<const CachedResultSet*>& entries() const { return entries_; }

 private:
  const std::size_t textLength_;
  const double scale_;
  const UUID& userGuid_;
  std::size_t shortest_ = std::numeric_limits<std::size_t>::max();
  std::vector<const CachedResultSet*> entries_;
};

bool scoresHigher(const CachedResultSet& entry, const CachedResultSet& than) {
  return entry.completionScore() > 0 && entry.completionScore() > than.completionScore();
}

}  // namespace

QueryCache::QueryCache(Assembly& assembly, std::shared_ptr<Budget> bytes)
    : assembly_(assembly),
      queue_(assembly.platform().queues.makeSerialQueue("com.quenta.zelkor.queryCache")),
      bytes_(std::move(bytes)) {}

QueryCache::~QueryCache() = default;

void QueryCache::start() {
  for (const auto name : kClearingNotifications) {
    observations_.push_back(assembly_.notificationCenter().observe(
        std::string(name), [weak = weak_from_this()](const Notification&) {
          if (const auto self = weak.lock()) self->_cacheClearNotification();
        }));
  }
}

void QueryCache::set(CachedResultSet::Pointer resultSet) {
  set(std::vector<CachedResultSet::Pointer>{std::move(resultSet)});
}

void QueryCache::set(std::vector<CachedResultSet::Pointer> resultSets) {
  std::erase_if(resultSets, [this](const auto& resultSet) { return !_accepts(resultSet); });
  if (resultSets.empty()) return;
  queue_->async([weak = weak_from_this(), resultSets = std::move(resultSets)] {
    const auto self = weak.lock();
    if (!self) return;
    for (const auto& resultSet : resultSets) self->_store(resultSet);
  });
}

bool QueryCache::_accepts(const CachedResultSet::Pointer& resultSet) const {
  if (!resultSet || resultSet->data().empty() || resultSet->query().empty()) return false;
  if (resultSet->query().find('\0') != std::string::npos) return false;  // not a key
  if (resultSet->inputLength() <= resultSet->queryLength()) return true;
  assembly_.log(Category::Caching)
      .error("BUG: NOT caching '{}' because input is longer than completed query '{}'",
             priv(resultSet->query()), priv(resultSet->input()));
  return false;
}

void QueryCache::_store(const CachedResultSet::Pointer& resultSet) {
  queue_->assertCurrent();
  const auto& log = assembly_.log(Category::Caching);
  const auto charge = resultSet->cost() + kEntrySurcharge;
  if (charge >= kCacheLimit) {
    log.error("NOT caching '{}' with cost {}", priv(resultSet->query()), resultSet->cost());
    return;
  }
  log.info("caching '{}' with cost {}", priv(resultSet->query()), resultSet->cost());
  if (currentCost_ + charge >= kCacheLimit) {
    log.info("!!! exceeded max cost, flushing cache !!!");
    _clearCache();
  }
  if (!_takeRoom(charge)) return;
  // A replaced entry's charge stays: the total goes down only when everything goes.
  currentCost_ += charge;
  tree_.setObject(resultSet, resultSet->query());
  if (tree_.count() == 1) _didBecomeNonEmpty();
}

bool QueryCache::_takeRoom(std::uint64_t charge) {
  queue_->assertCurrent();
  if (!bytes_) return true;
  const auto holder = holder_.get();
  auto share = bytes_->take(holder, charge);
  if (!share && !shares_.empty()) {
    assembly_.log(Category::Caching).info("no room among all caches, flushing cache");
    _clearCache();
    shares_.clear();  // also when all that it held has expired
    share = bytes_->take(holder, charge, Budget::Refusal::Silent);
  }
  if (!share) return false;
  shares_.push_back(*std::move(share));
  return true;
}

CachedResultSet::Pointer QueryCache::get(const std::string& text) {
  ZLKSearchRequest request;
  request.queryString = text;
  return getRequest(request);
}

CachedResultSet::Pointer QueryCache::getRequest(const ZLKRequest& request, const UUID& userGuid) {
  const auto text = lowercased(request.queryString);
  assembly_.log(Category::Caching).debug("cache lookup: {}", priv(text));
  CachedResultSet::Pointer found;
  queue_->sync([&] { found = _find(text, request.scale, userGuid); });
  return found;
}

CachedResultSet::Pointer QueryCache::_find(const std::string& text, double scale,
                                           const UUID& userGuid) {
  queue_->assertCurrent();
  const auto now = assembly_.platform().clock.now();
  ShortestCompletions shortest(utf16Length(text), scale, userGuid);
  std::vector<CachedResultSet::Pointer> expired;
  tree_.keysMatchingPrefix(text, [&](std::string_view, const CachedResultSet& entry, bool&) {
    if (entry.hasExpired(now)) {
      expired.emplace_back(&entry);
    } else {
      shortest.consider(entry);
    }
  });
  for (const auto& entry : expired) tree_.removeObjectForKey(entry->query());
  const auto& log = assembly_.log(Category::Caching);
  const CachedResultSet* best = nullptr;
  for (const auto* entry : shortest.entries()) {
    log.debug("entry {} prefix: {} input: {} score: {:.6f}", fmt::ptr(entry), priv(text),
              priv(entry->input()), entry->completionScore());
    if (!best || scoresHigher(*entry, *best)) best = entry;
  }
  return CachedResultSet::Pointer(best);
}

void QueryCache::_cacheClearNotification() { removeAllObjects(); }

void QueryCache::removeAllObjects() {
  queue_->async([weak = weak_from_this()] {
    if (const auto self = weak.lock()) self->_clearCache();
  });
}

std::size_t QueryCache::count() {
  std::size_t keys = 0;
  queue_->sync([&] {
    queue_->assertCurrent();
    keys = tree_.count();
  });
  return keys;
}

void QueryCache::_clearCache() {
  queue_->assertCurrent();
  if (tree_.count() == 0) return;
  tree_.removeAllObjects();
  currentCost_ = 0;
  shares_.clear();
  _didBecomeEmpty();
}

void QueryCache::_didBecomeNonEmpty() {
  queue_->assertCurrent();
  if (transaction_) return;
  assembly_.log(Category::Caching).debug("query cache no longer empty");
  transaction_ = assembly_.platform().transactions.open("queryCache");
  source_ = assembly_.platform().memoryPressure.onCritical(*queue_, [weak = weak_from_this()] {
    const auto self = weak.lock();
    if (!self) return;
    self->assembly_.log(Category::Caching).debug("emptying caches under memory pressure");
    self->_clearCache();
  });
}

void QueryCache::_didBecomeEmpty() {
  queue_->assertCurrent();
  assembly_.log(Category::Caching).debug("query cache became empty");
  transaction_.reset();
  source_.reset();
}

}  // namespace zelkord
