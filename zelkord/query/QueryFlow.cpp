#include "zelkord/query/QueryFlow.h"

#include "zelkord/assembly/Assembly.h"
#include "zelkord/feedback/UserGUIDSource.h"
#include "zelkord/network/exchange/RequestLogText.h"
#include "zelkord/network/exchange/ZLKRetryableNetworkRequest.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"
#include "zelkord/query/ErrorCodes.h"
#include "zelkord/query/NetworkRecords.h"
#include "zelkord/query/ResponseImages.h"
#include "zelkord/query/RoutingProxy.h"
#include "zelkord/query/VerboseReply.h"

namespace zelkord {
namespace {

constexpr unsigned kFirstAttempt = 1;
constexpr unsigned kRetries = 3;

}  // namespace

QueryFlow::QueryFlow(const QueryKind& kind, std::shared_ptr<ClientState> state,
                     std::shared_ptr<const ZLKRequest> request, ReplyCallback reply)
    : kind_(kind),
      state_(std::move(state)),
      request_(std::move(request)),
      assembly_(state_->assembly()),
      reply_(std::move(reply)) {}

void QueryFlow::start() {
  if (_passesGates()) _send();
}

void QueryFlow::_send() {
  _logDispatch();
  const auto bag = state_->currentBag();
  userGuid_ = state_->guidController().currentUserGUID();
  auto request = kind_.makeRequest(
      {*assembly_.requestFactory(), *request_, bag.get(), userGuid_, state_->fieldMask()});
  if (!request) return _reply(std::nullopt, zelkorError(kBagFault, "no URL"));
  httpRequest_ = *std::move(request);
  // What people type goes before what they follow up.
  if (kind_.transport != QueryTransport::Plain) httpRequest_.priority = TransferPriority::Low;
  _logRequest();
  state_->record(_makeStart(httpRequest_), *request_, userGuid_);
  const auto task = _makeTask(bag.get());
  if (kind_.routing == QueryRouting::ThroughProxy) useRoutingProxy(assembly_, *task);
  task->resume();
  _didSend();
  state_->_markNetworkRequest();
}

void QueryFlow::_logRequest() const {
  if (kind_.exchangeLog == ExchangeLog::Silent || !_log().isEnabled(LogLevel::Debug)) return;
  const bool show = assembly_.platform().log.showsPrivateData();
  _log().debug("request: {} header: {}", urlForLog(httpRequest_.url, show),
               priv(headersForLog(httpRequest_.headers)));
}

std::shared_ptr<const HVFeedback> QueryFlow::_makeStart(const URLRequest& request) const {
  return startNetworkSearch(request, _origin(request_->triggerEvent));
}

NetworkSearchOrigin QueryFlow::_origin(std::uint32_t triggerEvent) const {
  return {.triggerEvent = static_cast<std::int32_t>(triggerEvent),
          .endpointType = kind_.endpoint,
          .input = _input(),
          .uuid = request_->uuid};
}

std::shared_ptr<URLTask> QueryFlow::_makeTask(const ZLKBag* bag) {
  auto completion = [self = shared_from_this()](const auto& task, const URLResult& result) {
    self->_finish(task, result);
  };
  auto& session = assembly_.urlSession();
  if (kind_.transport == QueryTransport::Plain) {
    return session.dataTask(httpRequest_, std::move(completion));
  }
  const auto retryable = std::make_shared<const ZLKRetryableNetworkRequest>(
      ZLKRetryableNetworkRequest{httpRequest_, _deadline(bag)});
  const auto& platform = assembly_.platform();
  return dataTaskWithRetryableRequest(session, retryable, kFirstAttempt, kRetries,
                                      std::move(completion), {platform.clock, platform.queues});
}

void QueryFlow::_finish(const std::shared_ptr<URLTask>& task, const URLResult& result) {
  if (result.response && result.response->status) state_->recordSearchResult(result.status());
  _logAnswer();
  if (kind_.exchangeLog != ExchangeLog::Silent && _log().isEnabled(LogLevel::Debug)) {
    _log().debug("resp: {}", _responseForLog(result));
  }
  if (const auto refusal = _refusalOfAnswer(result)) {
    _fail(*task, result, *refusal);
  } else {
    _accept(task, result);
  }
}

void QueryFlow::_accept(const std::shared_ptr<URLTask>& task, const URLResult& result) {
  Body body{.data = result.data.value_or(Data())};
  body.parsed = parseJson(body.data.view(), &body.problem);
  if (const auto refusal = _refusalOfBody(body)) return _fail(*task, result, *refusal);
  _filter(body);
  if (body.parsed) _use(*body.parsed, body.data);
  endNetworkFeedback(state_, *request_, body.parsed ? &*body.parsed : nullptr, result, task);
  auto reply = _makeReply(body.data);
  if (request_->verboseReply) addHTTPExchange(reply, httpRequest_, *result.response);
  _willReply(*result.response);
  _reply(std::move(reply), std::nullopt);
}

void QueryFlow::_use(const json::value& rawResponse, const Data& data) {
  if (auto* images = assembly_.responseImages()) {
    images->processImagesFromResponse(rawResponse, state_->currentBag().get());
  }
  _didParse(rawResponse, data);
}

void QueryFlow::_fail(const URLTask& task, const URLResult& result, const Refusal& refusal) {
  failSearchFeedback(*state_, refusal.error, *request_, result, task.timingData());
  _reply(std::nullopt, refusal.error);
}

ZLKReply QueryFlow::_makeReply(Data data) const {
  ZLKReply reply;
  reply.scale = request_->scale;
  reply.data = std::move(data);
  const auto session =
      assembly_.requestFactory()->getMapsUserSessionEntityAndReset(false, userGuid_);
  if (session) reply.geoSessionEntityString = session->sessionEntityString();
  return reply;
}

void QueryFlow::_reply(std::optional<ZLKReply> reply, std::optional<Error> error) {
  reply_(request_->queryId, std::move(reply), std::move(error));
}

const Logger& QueryFlow::_log() const { return assembly_.log(kind_.category); }

std::string QueryFlow::_responseForLog(const URLResult& result) const {
  return responseForLog(result.response, assembly_.platform().log.showsPrivateData());
}

}  // namespace zelkord
