#pragma once

#include <atomic>
#include <memory>
#include <optional>
#include <string>

#include "base/Guarded.h"
#include "platform/api/Interprocess.h"
#include "zelkord/assembly/InstalledBag.h"
#include "zelkord/query/ClientState.h"

namespace zelkord {

class Assembly;

// Tells one client about the bag: once it has configured itself, and after each change from then
// on. The last that a client is told is the bag that is in force.
//
// Threading: any thread. The wait for the bag is on a global queue, one at a time: however often a
// client configures itself, it keeps one thread at most. Changes are told on the thread that
// installs the bag. Ownership: the assembly outlives it; a wait under way keeps it alive. Errors: a
// client that cannot be reached is logged.
class BagTeller final : public std::enable_shared_from_this<BagTeller> {
 public:
  BagTeller(Assembly& assembly, std::shared_ptr<ipc::Connection> connection);
  ~BagTeller();

  // Tells the bag as the state has it for that user agent, or why there is none after a second.
  // Calls that come during the wait share one more.
  void clientConfigured(std::shared_ptr<ClientState> state, std::optional<std::string> userAgent);
  // Nothing is told any more.
  void end();

 private:
  bool _hasEnded() const;
  bool _isObserving() const;
  void _deliverAsOftenAsWanted();
  void _deliver();
  void _logDelivery(const ClientState& state, const ZLKBag* bag,
                    const std::optional<Error>& error) const;
  void _observeBag();
  void _bagChangeNotification(BagNews news, const BagPointer& bag);
  void _logChange(const ZLKBag* bag) const;
  void _tell(const BagPointer& bag, const std::optional<Error>& error) ZK_REQUIRES(mutex_);

  // Fixed after construction.
  Assembly& assembly_;
  const std::shared_ptr<ipc::Connection> connection_;

  // Own synchronisation.
  Guarded<std::shared_ptr<ClientState>> state_;
  Guarded<std::optional<std::string>> userAgent_;
  std::atomic<unsigned> deliveriesWanted_ = 0;
  mutable Mutex mutex_;
  Subscription observation_ ZK_GUARDED_BY(mutex_);
  BagPointer told_ ZK_GUARDED_BY(mutex_);  // last; null: none, or an error
  bool ended_ ZK_GUARDED_BY(mutex_) = false;
};

}  // namespace zelkord
