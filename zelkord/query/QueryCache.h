#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "base/Guarded.h"
#include "corezelkor/Messages.h"
#include "platform/api/Budget.h"
#include "platform/api/ProcessTransactions.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/query/CachedResultSet.h"
#include "zelkord/resources/CritbitTree.h"

namespace zelkord {

class Assembly;

// A client's results of earlier searches by completed query: a later keystroke whose text is the
// beginning of such a query is answered without the network.
//
// Bounded to 2 MiB of response bodies, each entry charged its response's whole body and 1,024
// bytes; what would go beyond drops everything. Also emptied when something changes that results
// depend on (identity, locale, time zone, country, restrictions) and when memory runs out. While it
// holds entries it holds a transaction. What all caches hold is bounded too: one for whose entry
// there is no room is emptied as a full one is, and goes without the entry if that is not enough.
//
// States: empty, non-empty (a transaction and a memory-pressure source).
// Threading: any thread; storing and clearing never wait, looking up waits for one short task.
// Ownership: entries are shared with whoever looks them up.
class QueryCache final : public std::enable_shared_from_this<QueryCache> {
 public:
  // `bytes`: of all caches. Null: only its own bound counts.
  explicit QueryCache(Assembly& assembly, std::shared_ptr<Budget> bytes = nullptr);
  ~QueryCache();

  // Begins to observe what empties it. Right after construction.
  void start();

  // Whose share of all caches' bytes further entries take.
  void setHolder(std::string holder) { holder_.set(std::move(holder)); }
  void set(CachedResultSet::Pointer resultSet);
  // Those of one response, in order, as one task.
  void set(std::vector<CachedResultSet::Pointer> resultSets);
  // The best set for the request's text and scale; null when there is none. Of the completions that
  // begin with the text and were fetched for no longer text, the shortest one; among those the best
  // score. Only of what was fetched under the user identifier: an entry of another one waits to be
  // cleared.
  CachedResultSet::Pointer getRequest(const ZLKRequest& request, const UUID& userGuid = {});
  CachedResultSet::Pointer get(const std::string& text);
  void removeAllObjects();
  std::size_t count();

 private:
  void _cacheClearNotification();
  bool _accepts(const CachedResultSet::Pointer& resultSet) const;
  void _store(const CachedResultSet::Pointer& resultSet);
  // Whether all caches have room for that charge, if need be without what this one holds.
  bool _takeRoom(std::uint64_t charge);
  CachedResultSet::Pointer _find(const std::string& text, double scale, const UUID& userGuid);
  void _clearCache();
  void _didBecomeNonEmpty();
  void _didBecomeEmpty();

  // Fixed after construction.
  Assembly& assembly_;
  const std::unique_ptr<SerialQueue> queue_;
  const std::shared_ptr<Budget> bytes_;
  std::vector<Subscription> observations_;

  // Own synchronisation.
  Guarded<std::string> holder_;

  // Queue state.
  CritbitTree<const CachedResultSet> tree_ ZK_ON(queue_);
  std::uint64_t currentCost_ ZK_ON(queue_) = 0;
  std::vector<Budget::Share> shares_ ZK_ON(queue_);  // of that, by entry
  Transaction transaction_ ZK_ON(queue_);
  Subscription source_ ZK_ON(queue_);
};

}  // namespace zelkord
