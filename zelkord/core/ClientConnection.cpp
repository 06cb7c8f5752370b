#include "zelkord/core/ClientConnection.h"

#include "base/Text.h"
#include "corezelkor/Constants.h"
#include "platform/api/RandomUUID.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/network/exchange/ErrorFeedback.h"
#include "zelkord/query/ErrorCodes.h"

namespace zelkord {

ClientConnection::ClientConnection(Assembly& assembly, std::shared_ptr<ipc::Connection> connection,
                                   OtherCalls otherCalls)
    : assembly_(assembly),
      clientStateManager_(*assembly.clientStateManager()),
      connection_(std::move(connection)),
      otherCalls_(std::move(otherCalls)),
      reports_(assembly),
      bagTeller_(std::make_shared<BagTeller>(assembly, connection_)),
      transaction_(assembly.platform().transactions.open("clientConnection")),
      waitingQueue_(
          assembly.platform().queues.makeSerialQueue("com.quenta.zelkord.connection.waiting")) {}

ClientConnection::~ClientConnection() = default;

void ClientConnection::start() {
  timer_ =
      IdleTimer::make(assembly_.platform().queues,
                      [&assembly = assembly_, weak = std::weak_ptr<ipc::Connection>(connection_)] {
                        const auto connection = weak.lock();
                        if (!connection) return;
                        assembly.log(Category::Connection).debug("timing out idle xpc connection");
                        connection->invalidate();
                      });
}

void ClientConnection::invalidated() {
  ended_ = true;
  timer_->cancel();
  bagTeller_->end();
}

const ServedInterface<ClientConnection>& ClientConnection::interface() {
  using Self = ClientConnection;
  static const ServedInterface<Self> kInterface = {
      kDaemonInterface,
      {
          {{"Configure", "a{sv} configuration", "s endpointAddress"},
           &Self::configure,
           CallTurn::Ahead},
          {{"Bag", "", "a{sv} bag, a{sv} error"}, &Self::bag, CallTurn::AfterBag},
          {{"Request", "s kind, a{sv} request", "x queryId, a{sv} reply, a{sv} error"},
           &Self::request,
           CallTurn::AfterBag},
          {{"ReportEvent", "s event, x queryId, s feedbackClass, ay feedback", "", true},
           &Self::reportEvent},
          {{"ReportEventData", "s event, x queryId, ay payload", "", true}, &Self::reportEventData},
          {{"Feedback", "s name", "as feedbacksAsJSON, a{sv} error"}, &Self::feedback},
          {{"ListSessions", "", "aa{ss} sessions"}, &Self::listSessions},
      },
      {{"Invalidated", ""}}};
  return kInterface;
}

void ClientConnection::handle(ipc::Call call) {
  timer_->rearm();
  const auto* member = interface().find(call);
  if (_mayHaveToWait(member)) {
    _handleLater(member, std::move(call));
  } else {
    _handleNow(member, std::move(call));
  }
}

bool ClientConnection::_mayHaveToWait(const Member<ClientConnection>* member) const {
  const auto turn = member ? member->turn : CallTurn::InOrder;
  if (turn == CallTurn::Ahead) return false;
  if (waitingCalls_ > 0) return true;
  const auto state = turn == CallTurn::AfterBag ? state_.get() : nullptr;
  return state && !state->currentBag();
}

void ClientConnection::_handleLater(const Member<ClientConnection>* member, ipc::Call call) {
  ++waitingCalls_;
  waitingQueue_->async([self = shared_from_this(), member, call = std::move(call)]() mutable {
    if (!self->ended_) self->_handleNow(member, std::move(call));
    --self->waitingCalls_;
  });
}

void ClientConnection::_handleNow(const Member<ClientConnection>* member, ipc::Call call) {
  if (member) {
    (this->*member->handle)(call);
  } else if (otherCalls_) {
    otherCalls_->handle(std::move(call));
  }
}

void ClientConnection::_refuse(const ipc::Call& call, const WireFault& fault) {
  assembly_.log(Category::Connection)
      .error("(pid:{}) {} refused: {}", peer().pid, call.member, fault.text);
  call.reply->fail(fault.errorName, fault.text);
}

void ClientConnection::configure(const ipc::Call& call) {
  auto decoded = decodeConfiguration(call.argument<ipc::Dictionary>(0));
  if (const auto* fault = std::get_if<WireFault>(&decoded)) return _refuse(call, *fault);
  auto& configuration = std::get<ZLKSessionConfiguration>(decoded);
  assembly_.log(Category::Connection)
      .notice("client configuration {}", configuration.description());
  if (!_fits(configuration)) return call.reply->fail(ipc::kLimitsExceeded, "too many clients");
  configuration_.set(std::move(configuration));
  _ensureState();
  const auto state = state_.get();
  if (!state) return _refuseConfiguration();
  state->adoptUserAgent(userAgent_.get());
  call.reply->send({clientStateManager_.endpoint()});
  bagTeller_->clientConfigured(state, userAgent_.get());
}

bool ClientConnection::_fits(const ZLKSessionConfiguration& configuration) const {
  const auto bound = state_.get();
  const auto userAgent =
      createUserAgentString(configuration.userAgent, assembly_.platform().device);
  if (configuration.identifier.empty() || !userAgent) return true;  // refused, or without effect
  return clientStateManager_.admit(bound ? bound->identifier() : configuration.identifier,
                                   *userAgent, peer().pid);
}

void ClientConnection::_refuseConfiguration() {
  reportErrorAsZelkordFeedback(zelkorError(kConnectionFault, "invalid configuration"), assembly_);
  assembly_.log(Category::Session).fault("invalid configuration, closing connection");
  connection_->invalidate();
}

void ClientConnection::_ensureState() {
  const MutexLock lock(bindingMutex_);
  const auto& log = assembly_.log(Category::Session);
  const auto configuration = configuration_.get();
  if (!configuration) return log.fault("configuration must not be nil");
  const auto userAgent =
      createUserAgentString(configuration->userAgent, assembly_.platform().device);
  if (configuration->identifier.empty() || !userAgent) {
    return log.fault("configuration requires identifier and agent");
  }
  userAgent_.set(userAgent);
  if (const auto bound = state_.get()) {
    if (bound->identifier() != configuration->identifier) {
      log.fault("session identifier must match");
    }
    return;
  }
  if (const auto state = clientStateManager_.stateForClientIdentifier(configuration->identifier)) {
    state->setConfiguration(*configuration);
    state->setProcess(peer().pid);
    state_.set(state);
  }
}

void ClientConnection::bag(const ipc::Call& call) {
  _ensureState();
  const auto state = state_.get();
  if (!state) return;
  state->bag(userAgent_.get(),
             [&call, mark = timer_->callBegan()](const auto& bag, const auto& error) {
               call.reply->send({encodeBag(bag.get()), encodeError(error)});
             });
}

void ClientConnection::request(const ipc::Call& call) {
  auto decoded = decodeRequest(call.argument<std::string>(0), call.argument<ipc::Dictionary>(1));
  if (const auto* fault = std::get_if<WireFault>(&decoded)) return _refuse(call, *fault);
  _ensureState();
  const auto& request = std::get<MutableRequest>(decoded);
  if (!request) return;
  _fillMissing(*request);
  const auto& kind = queryKindOf(*request);
  auto reply = _traced(kind, _replyTo(call.reply));
  if (kind.goesStale) {
    if (!_accepts(request->queryId)) return reply(request->queryId, std::nullopt, std::nullopt);
    reply = _unlessStale(request->queryId, std::move(reply));
  }
  if (const auto state = state_.get()) kind.start(kind, state, request, std::move(reply));
}

void ClientConnection::_fillMissing(ZLKRequest& request) {
  auto& textInput = assembly_.platform().textInput;
  if (request.keyboardInputMode.empty()) {
    request.keyboardInputMode = textInput.currentInputMode();
    assembly_.defaultLog().debug("keyboardInputMode property not set, using {}",
                                 request.keyboardInputMode);
  }
  if (request.scale == 0) {
    request.scale = textInput.mainScreenScale();
    assembly_.defaultLog().debug("request scale property not set, using {:.6f}", request.scale);
  }
  if (request.uuid.empty()) request.uuid = randomUUID(assembly_.platform().random).string();
}

ReplyCallback ClientConnection::_replyTo(const std::shared_ptr<ipc::Reply>& reply) {
  return [reply, mark = timer_->callBegan()](std::int64_t queryId, const auto& answer,
                                             const auto& error) {
    reply->send({queryId, encodeReply(answer), encodeError(error)});
  };
}

ReplyCallback ClientConnection::_traced(const QueryKind& kind, ReplyCallback reply) const {
  const auto& tracing = assembly_.tracing();
  if (!kind.trace || !tracing.isEnabled()) return reply;
  tracing.emit(kind.trace->start);
  return [&tracing, end = kind.trace->end, reply = std::move(reply)](std::int64_t queryId,
                                                                     auto answer, auto error) {
    tracing.emit(end);
    reply(queryId, std::move(answer), std::move(error));
  };
}

ReplyCallback ClientConnection::_unlessStale(std::int64_t queryId, ReplyCallback reply) {
  return [self = shared_from_this(), queryId, reply = std::move(reply)](std::int64_t answered,
                                                                        auto answer, auto error) {
    if (self->currentQueryId_ > queryId) return reply(answered, std::nullopt, std::nullopt);
    reply(answered, std::move(answer), std::move(error));
  };
}

// Makes `queryId` the current one when it is newer; false when it is stale, also when another
// thread was faster.
bool ClientConnection::_accepts(std::int64_t queryId) {
  auto current = currentQueryId_.load();
  return queryId > current && currentQueryId_.compare_exchange_strong(current, queryId);
}

void ClientConnection::reportEvent(const ipc::Call& call) {
  _report(call, decodeFeedback(call.argument<std::string>(2), call.argument<Data>(3).view()));
}

void ClientConnection::reportEventData(const ipc::Call& call) {
  _report(call, decodeFeedbackPayload(call.argument<Data>(2).view()));
}

// The event's name, the first argument, says nothing that the feedback does not. A caller that
// waits is answered when the feedback is written.
void ClientConnection::_report(const ipc::Call& call, Decoded<MutableFeedback> feedback) {
  if (const auto* fault = std::get_if<WireFault>(&feedback)) return _refuse(call, *fault);
  const bool fits = reports_.reportPayload(std::get<MutableFeedback>(std::move(feedback)),
                                           call.argument<std::int64_t>(1), state_.get(),
                                           {peer().pid, call.reply});
  if (!fits) call.reply->fail(ipc::kLimitsExceeded, "too much feedback waits to be written");
}

void ClientConnection::feedback(const ipc::Call& call) {
  const auto state = state_.get();
  if (!state) return;
  auto records = state->sessionManager().feedbacksWithRelativeTimestamp();
  for (auto& record : records) record = withEscapedNoncharacters(std::move(record));
  call.reply->send({std::move(records), ipc::Dictionary{}});
}

void ClientConnection::listSessions(const ipc::Call& call) {
  call.reply->send({clientStateManager_.sessions()});
}

void ClientConnection::flushSessionInvalidation(std::function<void(bool flushed)> callback) {
  const auto state = state_.get();
  if (!state) return callback(false);
  state->sessionManager().flushSessionInvalidation(userAgent_.get(), peer().pid,
                                                   std::move(callback));
}

}  // namespace zelkord
