#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "base/Error.h"
#include "base/Guarded.h"
#include "base/Subscription.h"
#include "base/UUID.h"
#include "corezelkor/Messages.h"
#include "halvane/Feedback.h"
#include "platform/api/Budget.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/assembly/InstalledBag.h"
#include "zelkord/network/context/FieldMask.h"

namespace zelkord {

class Assembly;
class QueryCache;
class SessionManager;
class UserGUIDSource;

// What all clients' states share a bounded amount of.
struct ClientBudgets {
  Budget cacheBytes;  // as QueryCache
  Budget bagWaits;    // waits for a bag, each of which keeps a thread
};

using BagCallback = std::function<void(BagPointer bag, std::optional<Error> error)>;

// Everything that the daemon keeps for one client identifier, shared by all connections of that
// client: its configuration and user agent, the bag as that user agent sees it, its query cache,
// and where its feedback goes.
//
// Threading: every operation on any thread. Those that need the bag (`bag`, `search`,
// `zeroKeyword`, `lookup`) may wait for it for one second. Ownership: the assembly outlives it.
// Flows under way keep it alive. Errors: kZLKErrorDomain codes 1 (no bag, no user agent) and 500
// (the service's answer), or the task's error.
class ClientState final : public std::enable_shared_from_this<ClientState> {
 public:
  // `budgets`: of all states. Null: unbounded.
  ClientState(std::string identifier, Assembly& assembly,
              std::shared_ptr<ClientBudgets> budgets = nullptr);
  ~ClientState();

  const std::string& identifier() const { return identifier_; }
  const std::optional<std::string>& clientShortName() const { return clientShortName_; }
  std::optional<ZLKSessionConfiguration> configuration() const { return configuration_.get(); }
  void setConfiguration(ZLKSessionConfiguration configuration) {
    configuration_.set(std::move(configuration));
  }
  // Of whoever configured it last; 0 before.
  std::int64_t process() const { return process_.load(); }
  void setProcess(std::int64_t process);
  std::optional<std::string> userAgent() const;
  // For a state that has no bag yet; later ones are adopted.
  void setUserAgent(std::optional<std::string> userAgent);
  // The bag as the user agent of the moment sees it; null before there is one.
  BagPointer currentBag() const;
  SessionManager& sessionManager() const { return *sessionManager_; }
  UserGUIDSource& guidController() const { return *guidController_; }
  QueryCache* queryCache() const {
    return queryCache_.get();
  }  // null when "ZLKNoQueryCache" is set
  Assembly& assembly() const { return assembly_; }

  // Takes over a new, non-empty user agent: the bag is seen anew with it, and the query cache
  // emptied.
  void adoptUserAgent(const std::optional<std::string>& userAgent);
  // The same, then the bag, waiting for it for at most a second.
  void bag(const std::optional<std::string>& userAgent, const BagCallback& reply);

  // Opens a connection to the service ahead of the first query, unless one is still warm.
  void warm();

  // What the flows of its queries (QueryKind) share.

  // Whether there is a bag, waiting for one for at most a second; not at all beyond the process's
  // share of such waits.
  bool _ensureBag();
  void _markNetworkRequest();
  void _setPerformedSearch();
  // Adds one to the client's counter of that suffix; nothing for a client without a short name.
  void count(std::string_view suffix) const;
  // Counts the status under "fedapicall.serverstatus.".
  void recordSearchResult(int statusCode) const;
  // Whether the client's user agent asks for requests without location ("messages"); the mask for
  // the request factory.
  FieldMask fieldMask() const;
  // Records on behalf of this client.
  void record(std::shared_ptr<const HVFeedback> feedback, const ZLKRequest& request,
              std::optional<UUID> userGuid) const;

 private:
  void _observeBag();
  void _bagChangeNotification(BagNews news, const BagPointer& bag);
  void _waitForBag();

  // Fixed after construction.
  Assembly& assembly_;
  const std::string identifier_;
  const std::optional<std::string> clientShortName_;
  const std::shared_ptr<ClientBudgets> budgets_;
  std::shared_ptr<QueryCache> queryCache_;
  std::shared_ptr<UserGUIDSource> ownGuidController_;  // with individual sessions only
  std::shared_ptr<SessionManager> ownSessionManager_;
  UserGUIDSource* guidController_ = nullptr;
  SessionManager* sessionManager_ = nullptr;

  // Own synchronisation.
  Guarded<std::optional<ZLKSessionConfiguration>> configuration_;
  mutable Mutex viewMutex_;
  std::optional<std::string> userAgent_ ZK_GUARDED_BY(viewMutex_);
  BagPointer bag_ ZK_GUARDED_BY(viewMutex_);  // as userAgent_ sees it
  Guarded<std::optional<SteadyTime>> lastNetworkRequest_;
  const std::unique_ptr<Semaphore> bagFetchSemaphore_;
  std::atomic<unsigned> bagWaiters_ = 0;
  std::atomic<std::int64_t> process_ = 0;
  Mutex observationMutex_;
  Subscription bagObservation_ ZK_GUARDED_BY(observationMutex_);
};

}  // namespace zelkord
