#include "zelkord/core/ClientConnection.h"

#include "base/Text.h"
#include "corezelkor/Constants.h"
#include "platform/api/RandomUUID.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/core/ClientStateManager.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/network/ErrorFeedback.h"
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

void ClientConnection::handle(ipc::Call call) {
  timer_->rearm();
  if (_mayHaveToWait(call)) {
    _handleLater(std::move(call));
  } else {
    _dispatchCall(std::move(call));
  }
}

bool ClientConnection::_mayHaveToWait(const ipc::Call& call) const {
  const bool isDaemonCall = call.interface == kDaemonInterface;
  if (isDaemonCall && call.member == "Configure") return false;
  if (waitingCalls_ > 0) return true;
  if (!isDaemonCall || (call.member != "Bag" && call.member != "Request")) return false;
  const auto state = state_.get();
  return state && !state->currentBag();
}

void ClientConnection::_handleLater(ipc::Call call) {
  ++waitingCalls_;
  waitingQueue_->async([self = shared_from_this(), call = std::move(call)]() mutable {
    if (!self->ended_) self->_dispatchCall(std::move(call));
    --self->waitingCalls_;
  });
}

void ClientConnection::_dispatchCall(ipc::Call call) {
  if (call.interface == kDaemonInterface) {
    _handleDaemonCall(call);
  } else if (otherCalls_) {
    otherCalls_->handle(std::move(call));
  }
}

void ClientConnection::_handleDaemonCall(const ipc::Call& call) {
  if (call.member == "Configure") return _handleConfigure(call);
  if (call.member == "Bag") return bag(call.reply);
  if (call.member == "Request") return _handleRequest(call);
  if (call.member == "ReportEvent") return _handleReportEvent(call);
  if (call.member == "ReportEventData") return _handleReportEventData(call);
  if (call.member == "Feedback") return feedback(call.reply);
  if (call.member == "ListSessions") return listSessions(call.reply);
}

void ClientConnection::_handleConfigure(const ipc::Call& call) {
  auto decoded = decodeConfiguration(*call.arguments.at(0).get<ipc::Dictionary>());
  if (const auto* fault = std::get_if<WireFault>(&decoded)) return _refuse(call, *fault);
  configure(std::get<ZLKSessionConfiguration>(std::move(decoded)), call);
}

void ClientConnection::_handleRequest(const ipc::Call& call) {
  auto decoded = decodeRequest(*call.arguments.at(0).get<std::string>(),
                               *call.arguments.at(1).get<ipc::Dictionary>());
  if (const auto* fault = std::get_if<WireFault>(&decoded)) return _refuse(call, *fault);
  request(std::get<MutableRequest>(std::move(decoded)), call.reply);
}

void ClientConnection::_handleReportEvent(const ipc::Call& call) {
  reportEvent(call, decodeFeedback(*call.arguments.at(2).get<std::string>(),
                                   call.arguments.at(3).get<Data>()->view()));
}

void ClientConnection::_handleReportEventData(const ipc::Call& call) {
  reportEvent(call, decodeFeedbackPayload(call.arguments.at(2).get<Data>()->view()));
}

void ClientConnection::_refuse(const ipc::Call& call, const WireFault& fault) {
  assembly_.log(Category::Connection)
      .error("(pid:{}) {} refused: {}", peer().pid, call.member, fault.text);
  call.reply->fail(fault.errorName, fault.text);
}

void ClientConnection::configure(ZLKSessionConfiguration configuration, const ipc::Call& call) {
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

void ClientConnection::bag(const std::shared_ptr<ipc::Reply>& reply) {
  _ensureState();
  const auto state = state_.get();
  if (!state) return;
  state->bag(userAgent_.get(),
             [&reply, mark = timer_->callBegan()](const auto& bag, const auto& error) {
               reply->send({encodeBag(bag.get()), encodeError(error)});
             });
}

void ClientConnection::request(std::shared_ptr<ZLKRequest> request,
                               const std::shared_ptr<ipc::Reply>& reply) {
  _ensureState();
  if (!request) return;
  _fillMissing(*request);
  const auto answer = _replyTo(reply);
  _dispatch(request, answer, &ClientConnection::search) ||
      _dispatch(request, answer, &ClientConnection::moreResults) ||
      _dispatch(request, answer, &ClientConnection::card) ||
      _dispatch(request, answer, &ClientConnection::zeroKeyword) ||
      _dispatch(request, answer, &ClientConnection::lookup) ||
      _dispatch(request, answer, &ClientConnection::flightLookup) ||
      _dispatch(request, answer, &ClientConnection::flightSearch);
}

template <typename Request>
bool ClientConnection::_dispatch(const std::shared_ptr<ZLKRequest>& request,
                                 const ReplyCallback& reply,
                                 void (ClientConnection::*operation)(std::shared_ptr<const Request>,
                                                                     ReplyCallback)) {
  const auto query = std::dynamic_pointer_cast<const Request>(request);
  if (query) (this->*operation)(query, reply);
  return query != nullptr;
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

void ClientConnection::search(std::shared_ptr<const ZLKSearchRequest> request,
                              ReplyCallback reply) {
  const auto& tracing = assembly_.tracing();
  tracing.emit(TraceCode::SearchStart);
  const auto queryId = request->queryId;
  if (!_accepts(queryId)) {
    tracing.emit(TraceCode::SearchEnd);
    reply(queryId, std::nullopt, std::nullopt);
    return;
  }
  const auto state = state_.get();
  if (!state) return;
  state->search(std::move(request), [self = shared_from_this(), queryId, reply = std::move(reply)](
                                        std::int64_t answered, auto answer, auto error) {
    self->assembly_.tracing().emit(TraceCode::SearchEnd);
    if (self->currentQueryId_ > queryId) {
      reply(answered, std::nullopt, std::nullopt);
    } else {
      reply(answered, std::move(answer), std::move(error));
    }
  });
}

template <typename Request>
void ClientConnection::_forward(std::shared_ptr<const Request> request, ReplyCallback reply,
                                void (ClientState::*operation)(std::shared_ptr<const Request>,
                                                               ReplyCallback)) {
  const auto state = state_.get();
  if (state) ((*state).*operation)(std::move(request), std::move(reply));
}

ReplyCallback ClientConnection::_traced(TraceCode start, TraceCode end, ReplyCallback reply) const {
  const auto& tracing = assembly_.tracing();
  tracing.emit(start);
  return [&tracing, end, reply = std::move(reply)](std::int64_t queryId, auto answer, auto error) {
    tracing.emit(end);
    reply(queryId, std::move(answer), std::move(error));
  };
}

void ClientConnection::moreResults(std::shared_ptr<const ZLKMoreResultsRequest> request,
                                   ReplyCallback reply) {
  _forward(std::move(request), std::move(reply), &ClientState::moreResults);
}

void ClientConnection::card(std::shared_ptr<const ZLKCardRequest> request, ReplyCallback reply) {
  _forward(std::move(request), _traced(TraceCode::CardStart, TraceCode::CardEnd, std::move(reply)),
           &ClientState::card);
}

void ClientConnection::zeroKeyword(std::shared_ptr<const ZLKZeroKeywordRequest> request,
                                   ReplyCallback reply) {
  _forward(std::move(request),
           _traced(TraceCode::ZeroKeywordStart, TraceCode::ZeroKeywordEnd, std::move(reply)),
           &ClientState::zeroKeyword);
}

void ClientConnection::lookup(std::shared_ptr<const ZLKLookupRequest> request,
                              ReplyCallback reply) {
  _forward(std::move(request),
           _traced(TraceCode::LookupStart, TraceCode::LookupEnd, std::move(reply)),
           &ClientState::lookup);
}

void ClientConnection::flightLookup(std::shared_ptr<const ZLKFlightLookupRequest> request,
                                    ReplyCallback reply) {
  _forward(std::move(request), std::move(reply), &ClientState::flightLookup);
}

void ClientConnection::flightSearch(std::shared_ptr<const ZLKFlightSearchRequest> request,
                                    ReplyCallback reply) {
  _forward(std::move(request), std::move(reply), &ClientState::flightSearch);
}

// Makes `queryId` the current one when it is newer; false when it is stale, also when another
// thread was faster.
bool ClientConnection::_accepts(std::int64_t queryId) {
  auto current = currentQueryId_.load();
  return queryId > current && currentQueryId_.compare_exchange_strong(current, queryId);
}

// The event's name, the first argument, says nothing that the feedback does not. A caller that
// waits is answered when the feedback is written.
void ClientConnection::reportEvent(const ipc::Call& call, Decoded<MutableFeedback> feedback) {
  if (const auto* fault = std::get_if<WireFault>(&feedback)) return _refuse(call, *fault);
  const bool fits = reports_.reportPayload(std::get<MutableFeedback>(std::move(feedback)),
                                           *call.arguments.at(1).get<std::int64_t>(), state_.get(),
                                           {peer().pid, call.reply});
  if (!fits) call.reply->fail(ipc::kLimitsExceeded, "too much feedback waits to be written");
}

void ClientConnection::feedback(const std::shared_ptr<ipc::Reply>& reply) {
  const auto state = state_.get();
  if (!state) return;
  auto records = state->sessionManager().feedbacksWithRelativeTimestamp();
  for (auto& record : records) record = withEscapedNoncharacters(std::move(record));
  reply->send({std::move(records), ipc::Dictionary{}});
}

void ClientConnection::listSessions(const std::shared_ptr<ipc::Reply>& reply) {
  reply->send({clientStateManager_.sessions()});
}

void ClientConnection::flushSessionInvalidation(std::function<void(bool flushed)> callback) {
  const auto state = state_.get();
  if (!state) return callback(false);
  state->sessionManager().flushSessionInvalidation(userAgent_.get(), peer().pid,
                                                   std::move(callback));
}

}  // namespace zelkord
