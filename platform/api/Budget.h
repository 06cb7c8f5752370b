#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "base/Mutex.h"
#include "base/Namespace.h"
#include "base/Time.h"
#include "platform/api/Clock.h"
#include "platform/api/Counters.h"
#include "platform/api/Log.h"

namespace zelkord {

// Where refusals of all budgets are told: each is counted under "com.quenta.zelkord.limit.<name>",
// and one line a minute (of real time) names the budget, who met it last and how often.
//
// Threading: any thread. Ownership: clock, counters and log outlive it.
class LimitReports final {
 public:
  static constexpr Duration kLineEvery = std::chrono::minutes(1);

  LimitReports(const Clock& clock, Counters& counters, Logger log);

  // `name`: lower-case words joined by "_", public; so is `holder`, as "pid 12" or a host.
  void refused(std::string_view name, std::string_view holder, std::uint64_t times = 1);

 private:
  struct Line {
    std::optional<SteadyTime> last;
    std::uint64_t unsaid = 0;
  };
  std::uint64_t _toSay(std::string_view name, std::uint64_t times);

  const Clock& clock_;
  Counters& counters_;
  const Logger log_;
  Mutex mutex_;
  std::map<std::string, Line, std::less<>> lines_ ZK_GUARDED_BY(mutex_);
};

// A bounded amount of something that all clients share: connections, transfers, bytes of memory.
// Nobody gets more of it than one holder may have, and all together never more than there is.
//
// Threading: any thread; a few hundred nanoseconds.
// Ownership: shares may outlive the budget; its reports outlive both.
// Errors: what does not fit is refused, counted and named by the reports.
class Budget final {
 public:
  struct Size {
    std::uint64_t inAll = 0;
    std::uint64_t ofOneHolder = 0;
    // Who is the only holder may have this much, when it is more.
    std::uint64_t ofTheOnlyHolder = 0;
  };
  // A quarter for each holder, as for client processes.
  static Size quartered(std::uint64_t inAll) { return {inAll, inAll / 4, 0}; }
  // The same, and half for one that is alone.
  static Size halvedWhenAlone(std::uint64_t inAll) { return {inAll, inAll / 4, inAll / 2}; }

  // Silent: for who asks again and again for what was refused once.
  enum class Refusal { Reported, Silent };

  // What a holder has of the budget; given back when destroyed. Move-only; empty after a move.
  // Threading: one thread at a time.
  class [[nodiscard]] Share {
   public:
    Share() = default;
    Share(Share&& other) noexcept;
    Share& operator=(Share&& other) noexcept;
    ~Share();

    explicit operator bool() const { return account_ != nullptr; }
    std::uint64_t amount() const { return amount_; }
    // Makes it larger or smaller. False when the larger one does not fit; it stays as it is then.
    bool resize(std::uint64_t amount);
    void reset();

   private:
    friend class Budget;
    struct Account;
    Share(std::shared_ptr<Account> account, std::string holder, std::uint64_t amount);
    std::shared_ptr<Account> account_;
    std::string holder_;
    std::uint64_t amount_ = 0;
  };

  Budget(std::string name, Size size, LimitReports& reports);
  // Null: nobody hears of refusals.
  Budget(std::string name, Size size, LimitReports* reports);

  // Nothing when it does not fit.
  std::optional<Share> take(std::string_view holder, std::uint64_t amount = 1,
                            Refusal refusal = Refusal::Reported);

  const std::string& name() const;
  Size size() const;
  std::uint64_t held() const;
  std::uint64_t heldBy(std::string_view holder) const;
  // Who has most; nothing when nobody has any.
  std::optional<std::string> largestHolder() const;

 private:
  const std::shared_ptr<Share::Account> account_;
};

// How a process is named as the holder of a budget.
std::string processHolder(std::int64_t pid);

}  // namespace zelkord
