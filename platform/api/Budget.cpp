#include "platform/api/Budget.h"

#include <fmt/format.h>

#include <algorithm>
#include <utility>

namespace zelkord {

LimitReports::LimitReports(const Clock& clock, Counters& counters, Logger log)
    : clock_(clock), counters_(counters), log_(std::move(log)) {}

void LimitReports::refused(std::string_view name, std::string_view holder, std::uint64_t times) {
  counters_.add(fmt::format("com.quenta.zelkord.limit.{}", name), static_cast<std::int64_t>(times));
  if (const auto unsaid = _toSay(name, times); unsaid > 0) {
    log_.error("limit {} reached by {}, {} times since the last such line", name, holder, unsaid);
  }
}

std::uint64_t LimitReports::_toSay(std::string_view name, std::uint64_t times) {
  const auto now = clock_.realNow();
  const MutexLock lock(mutex_);
  auto found = lines_.find(name);
  if (found == lines_.end()) found = lines_.emplace(std::string(name), Line{}).first;
  auto& line = found->second;
  line.unsaid += times;
  if (line.last && now - *line.last < kLineEvery) return 0;
  line.last = now;
  return std::exchange(line.unsaid, 0);
}

struct Budget::Share::Account {
  Account(std::string budgetName, Size budgetSize, LimitReports* limitReports)
      : name(std::move(budgetName)), size(budgetSize), reports_(limitReports) {}

  bool take(const std::string& holder, std::uint64_t amount, Refusal refusal) {
    if (_take(holder, amount)) return true;
    if (reports_ && refusal == Refusal::Reported) reports_->refused(name, holder);
    return false;
  }

  void giveBack(const std::string& holder, std::uint64_t amount) {
    if (amount == 0) return;
    const MutexLock lock(mutex_);
    held_ -= amount;
    const auto found = holders_.find(holder);
    found->second -= amount;
    if (found->second == 0) holders_.erase(found);
  }

  std::uint64_t inAll() const {
    const MutexLock lock(mutex_);
    return held_;
  }

  std::uint64_t of(std::string_view holder) const {
    const MutexLock lock(mutex_);
    const auto found = holders_.find(holder);
    return found == holders_.end() ? 0 : found->second;
  }

  std::optional<std::string> largest() const {
    const MutexLock lock(mutex_);
    const std::pair<const std::string, std::uint64_t>* most = nullptr;
    for (const auto& holder : holders_) {
      if (!most || holder.second > most->second) most = &holder;
    }
    if (!most) return std::nullopt;
    return most->first;
  }

  const std::string name;
  const Size size;

 private:
  bool _take(const std::string& holder, std::uint64_t amount) {
    const MutexLock lock(mutex_);
    const auto found = holders_.find(holder);
    const auto own = found == holders_.end() ? 0 : found->second;
    const bool isAlone = holders_.size() == (found == holders_.end() ? 0 : 1);
    const auto most = isAlone ? std::max(size.ofOneHolder, size.ofTheOnlyHolder) : size.ofOneHolder;
    if (own > most || amount > size.inAll - held_ || amount > most - own) return false;
    held_ += amount;
    if (amount > 0) holders_[holder] += amount;
    return true;
  }

  LimitReports* const reports_;
  mutable Mutex mutex_;
  std::uint64_t held_ ZK_GUARDED_BY(mutex_) = 0;
  std::map<std::string, std::uint64_t, std::less<>> holders_ ZK_GUARDED_BY(mutex_);
};

Budget::Share::Share(std::shared_ptr<Account> account, std::string holder, std::uint64_t amount)
    : account_(std::move(account)), holder_(std::move(holder)), amount_(amount) {}

Budget::Share::Share(Share&& other) noexcept
    : account_(std::move(other.account_)),
      holder_(std::move(other.holder_)),
      amount_(std::exchange(other.amount_, 0)) {}

Budget::Share& Budget::Share::operator=(Share&& other) noexcept {
  if (this != &other) {
    reset();
    account_ = std::move(other.account_);
    holder_ = std::move(other.holder_);
    amount_ = std::exchange(other.amount_, 0);
  }
  return *this;
}

Budget::Share::~Share() { reset(); }

bool Budget::Share::resize(std::uint64_t amount) {
  if (!account_) return false;
  if (amount > amount_ && !account_->take(holder_, amount - amount_, Refusal::Reported))
    return false;
  if (amount < amount_) account_->giveBack(holder_, amount_ - amount);
  amount_ = amount;
  return true;
}

void Budget::Share::reset() {
  if (const auto account = std::exchange(account_, nullptr)) account->giveBack(holder_, amount_);
  amount_ = 0;
}

Budget::Budget(std::string name, Size size, LimitReports& reports)
    : Budget(std::move(name), size, &reports) {}

Budget::Budget(std::string name, Size size, LimitReports* reports)
    : account_(std::make_shared<Share::Account>(std::move(name), size, reports)) {}

std::optional<Budget::Share> Budget::take(std::string_view holder, std::uint64_t amount,
                                          Refusal refusal) {
  std::string owned(holder);
  if (!account_->take(owned, amount, refusal)) return std::nullopt;
  return Share(account_, std::move(owned), amount);
}

const std::string& Budget::name() const { return account_->name; }
Budget::Size Budget::size() const { return account_->size; }

std::uint64_t Budget::held() const { return account_->inAll(); }
std::uint64_t Budget::heldBy(std::string_view holder) const { return account_->of(holder); }
std::optional<std::string> Budget::largestHolder() const { return account_->largest(); }

std::string processHolder(std::int64_t pid) { return fmt::format("pid {}", pid); }

}  // namespace zelkord
