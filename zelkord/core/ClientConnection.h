#pragma once

#include <atomic>
#include <memory>
#include <optional>
#include <string>

#include "base/Guarded.h"
#include "base/Mutex.h"
#include "corezelkor/Messages.h"
#include "platform/api/Interprocess.h"
#include "platform/api/ProcessTransactions.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/core/BagTeller.h"
#include "zelkord/core/FeedbackReports.h"
#include "zelkord/core/FeedbackWire.h"
#include "zelkord/core/IdleTimer.h"
#include "zelkord/core/ServedInterface.h"
#include "zelkord/core/Wire.h"
#include "zelkord/query/ClientState.h"
#include "zelkord/query/QueryKind.h"

namespace zelkord {

class Assembly;
class ClientStateManager;

// One client's connection: what the client calls, and the way back to it.
//
// Unbound until a valid configuration arrives; then bound to the state of its client identifier for
// its life. It ends when the client goes away, when it is silent for too long, or after an invalid
// first configuration. While it lives it holds a transaction.
//
// Threading: calls arrive one at a time on the connection's queue. One that may have to wait for a
// bag does so on a queue of its own, and what comes meanwhile waits behind it there, in order; only
// `Configure` goes ahead. `currentQueryId`, the configuration and the state are read from others
// too. Ownership: the transport owns it through
// the connection; calls under way hold it. Errors: wrong arguments, and a configuration for
// which there is no room among all clients, are answered with a D-Bus error; of an unbound
// connection queries are dropped.
class ClientConnection final : public ipc::CallHandler,
                               public std::enable_shared_from_this<ClientConnection> {
 public:
  // Gets the calls of the interfaces that are not about a client, such as diagnostics.
  using OtherCalls = std::shared_ptr<ipc::CallHandler>;

  ClientConnection(Assembly& assembly, std::shared_ptr<ipc::Connection> connection,
                   OtherCalls otherCalls);
  ~ClientConnection() override;

  static const ServedInterface<ClientConnection>& interface();

  // Arms the idle timer. Right after construction.
  void start();
  // No call-back into the client and no time-out follows.
  void invalidated();

  void handle(ipc::Call call) override;
  void messageArrived() override { timer_->rearm(); }

  std::optional<ZLKSessionConfiguration> configuration() const { return configuration_.get(); }
  std::shared_ptr<ClientState> state() const { return state_.get(); }
  std::int64_t currentQueryId() const { return currentQueryId_; }
  ipc::Peer peer() const { return connection_->peer(); }

  // Ends the client's feedback session as far as it is its own; `callback` gets whether one was
  // ended.
  void flushSessionInvalidation(std::function<void(bool flushed)> callback);

  // The members of the interface, one for each of its rows.
  void configure(const ipc::Call& call);
  void bag(const ipc::Call& call);
  void request(const ipc::Call& call);
  void reportEvent(const ipc::Call& call);
  void reportEventData(const ipc::Call& call);
  // The records of the client's session, to the bound client only.
  void feedback(const ipc::Call& call);
  void listSessions(const ipc::Call& call);

 private:
  // Whether the call stands behind one that waits for a bag, or may wait for one itself. Null: it
  // is of another interface.
  bool _mayHaveToWait(const Member<ClientConnection>* member) const;
  void _handleLater(const Member<ClientConnection>* member, ipc::Call call);
  void _handleNow(const Member<ClientConnection>* member, ipc::Call call);
  void _refuse(const ipc::Call& call, const WireFault& fault);
  // Makes the state of that configuration, if it is to have one; false when there is no room for
  // it.
  bool _fits(const ZLKSessionConfiguration& configuration) const;
  void _ensureState();
  void _refuseConfiguration();
  void _fillMissing(ZLKRequest& request);
  ReplyCallback _replyTo(const std::shared_ptr<ipc::Reply>& reply);
  // Leaves the kind's trace events, now and ahead of the reply.
  ReplyCallback _traced(const QueryKind& kind, ReplyCallback reply) const;
  // Replies with nothing when a newer query has been accepted by then.
  ReplyCallback _unlessStale(std::int64_t queryId, ReplyCallback reply);
  bool _accepts(std::int64_t queryId);
  void _report(const ipc::Call& call, Decoded<MutableFeedback> feedback);

  // Fixed after construction.
  Assembly& assembly_;
  ClientStateManager& clientStateManager_;
  const std::shared_ptr<ipc::Connection> connection_;
  const OtherCalls otherCalls_;
  const FeedbackReports reports_;
  const std::shared_ptr<BagTeller> bagTeller_;
  const Transaction transaction_;
  const std::unique_ptr<SerialQueue> waitingQueue_;
  std::shared_ptr<IdleTimer> timer_;

  // Own synchronisation.
  std::atomic<unsigned> waitingCalls_ = 0;  // on the waiting queue
  std::atomic<bool> ended_ = false;
  Mutex bindingMutex_;  // held while the state is bound and the user agent made
  std::atomic<std::int64_t> currentQueryId_ = 0;
  Guarded<std::optional<ZLKSessionConfiguration>> configuration_;
  Guarded<std::shared_ptr<ClientState>> state_;
  Guarded<std::optional<std::string>> userAgent_;
};

}  // namespace zelkord
