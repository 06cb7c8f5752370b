#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "corezelkor/Messages.h"
#include "platform/api/Budget.h"
#include "platform/api/Interprocess.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/query/ClientState.h"
#include "zelkord/query/QueryKind.h"
#include "zelkord/query/ResponseImages.h"

namespace zelkord {

class Assembly;
class EndpointListener;

// All client states by client identifier; what one is made for, it is made once and kept. With the
// setting "ZLKPersistSessions" the clients' identifiers and user agents survive the process
// (setting "sessions"). As none is ever given up, how many a process has made, and how much they
// hold, is bounded.
//
// Also owns the endpoint: a private socket through which clients ask without going through their
// own connection.
//
// Threading: any thread; the states belong to `stateCacheQueue_`.
// Ownership: owned by the assembly.
class ClientStateManager final : public std::enable_shared_from_this<ClientStateManager> {
 public:
  explicit ClientStateManager(Assembly& assembly);
  ~ClientStateManager();

  // Opens the endpoint and loads the known clients. Right after construction.
  void start();

  // Makes room for that user agent in the state of that client, which is made when there is none.
  // False when there is none in that process's share: nothing has changed then. Requires texts
  // that are not empty.
  bool admit(const std::string& identifier, const std::string& userAgent, std::int64_t process);
  // The state of that client, made for the daemon itself when there is none; null for an empty
  // identifier and without room.
  std::shared_ptr<ClientState> stateForClientIdentifier(const std::string& identifier);
  // The state of that client if some connection has configured it, else null.
  std::shared_ptr<ClientState> configuredState(const std::string& identifier);
  // Calls that come before the states have been read share one write.
  void saveState();
  // {"identifier", "agent"} of every state that has a user agent.
  std::vector<ipc::StringMap> sessions();
  // D-Bus address of the endpoint.
  const std::string& endpoint() const;
  std::vector<std::shared_ptr<ClientState>> states();

  // A query that came through the endpoint: a kind that is there is answered as the state of the
  // configuration's identifier, whose own configuration and user agent stay. Other kinds, and a
  // null `request` (a kind that does not exist), get no answer; an identifier that no client has
  // configured gets an error.
  void request(const std::shared_ptr<ZLKRequest>& request,
               const ZLKSessionConfiguration& configuration, const ReplyCallback& reply);

  // As ResponseImages.
  void processImagesFromResponse(const json::value& response, const ZLKBag* bag);
  std::shared_ptr<ImageCall> loadImages(ImageOrder order, ImageCall::Completion completion);

 private:
  // A state and what it takes, with the longest user agent that it has had.
  struct Place {
    std::shared_ptr<ClientState> state;
    Budget::Share count;
    Budget::Share bytes;
  };
  using States = std::map<std::string, Place>;

  // The state, made when there is none; null when there is no room for it or its user agent.
  std::shared_ptr<ClientState> _place(const std::string& identifier, std::size_t userAgentSize,
                                      const std::string& holder);
  // False, after a log line, for an empty identifier.
  bool _isUsable(const std::string& identifier) const;
  void _loadState();
  void _save();
  std::vector<ipc::StringMap> _sessions() const;

  // Fixed after construction.
  Assembly& assembly_;
  const std::unique_ptr<SerialQueue> stateCacheQueue_;
  const bool persistSessions_;
  std::shared_ptr<EndpointListener> endpointListener_;
  std::unique_ptr<ipc::AnonymousListener> listener_;

  // Own synchronisation.
  std::atomic<bool> saveIsDue_ = false;
  Budget counts_;
  Budget bytes_;
  const std::shared_ptr<ClientBudgets> clientBudgets_;

  // Queue state.
  States stateCache_ ZK_ON(stateCacheQueue_);
};

}  // namespace zelkord
