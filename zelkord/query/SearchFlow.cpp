#include "zelkord/query/SearchFlow.h"

#include "base/Text.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/feedback/DaemonFeedback.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/feedback/UserGUIDSource.h"
#include "zelkord/network/RequestLogText.h"
#include "zelkord/network/ZLKNetworkRequestFactory.h"
#include "zelkord/network/ZelkorBagController.h"
#include "zelkord/query/ErrorCodes.h"
#include "zelkord/query/NetworkRecords.h"
#include "zelkord/query/QueryCache.h"
#include "zelkord/query/RoutingProxy.h"
#include "zelkord/query/VerboseReply.h"

namespace zelkord {
namespace {

constexpr std::int32_t kSearchEndpoint = 6;
constexpr std::uint32_t kCacheHitTrigger = 4;

}  // namespace

SearchFlow::SearchFlow(std::shared_ptr<ClientState> state,
                       std::shared_ptr<const ZLKSearchRequest> request, ReplyCallback reply)
    : assembly_(state->assembly()),
      state_(std::move(state)),
      request_(std::move(request)),
      reply_(std::move(reply)) {}

void SearchFlow::start() {
  _log().notice("session {} performing query[{}] {}, reply {}", state_->identifier(),
                static_cast<std::uint64_t>(request_->queryId), priv(request_->queryString),
                kCallbackText);
  state_->count("keystrokes");
  if (!_passesGates() || _answersFromCache()) return;
  _send();
}

bool SearchFlow::_passesGates() {
  if (!state_->_ensureBag()) {
    _log().error("Bag fetch failed, can't complete non-cached query {}.",
                 priv(request_->queryString));
    _skip(SkipReason::NoBag);
    _reply(std::nullopt, zelkorError(kBagFault, "timeout"));
    return false;
  }
  const auto bag = state_->currentBag();
  if (!bag->isEnabled()) {
    _log().debug("no search, bag disabled");
    _skip(SkipReason::BagDisabled);
    _reply(std::nullopt, std::nullopt);
    return false;
  }
  if (utf16Length(request_->queryString) < bag->minimumQueryLength()) {
    _log().debug("query[{}] input '{}' less than minQueryLength", request_->queryId,
                 priv(request_->queryString));
    _skip(SkipReason::TooShort);
    _reply(std::nullopt, std::nullopt);
    return false;
  }
  return true;
}

bool SearchFlow::_answersFromCache() {
  auto* cache = state_->queryCache();
  if (!cache) return false;
  const auto cached = cache->getRequest(*request_);
  if (!cached || !request_->queryItems.empty()) return false;
  auto reply = _makeReply(cached->data());
  state_->count("ondevicecachehits");
  state_->record(std::make_shared<ZLKCacheHitFeedback>(kCacheHitTrigger, request_->queryString,
                                                       cached->uuid()),
                 *request_, state_->guidController().currentUserGUID());
  _reply(std::move(reply), std::nullopt);
  return true;
}

void SearchFlow::_send() {
  _log().debug("Dispatching network request for (id, query): ({}, {})", request_->queryId,
               priv(request_->queryString));
  const auto bag = state_->currentBag();
  const auto guid = state_->guidController().currentUserGUID();
  const auto request =
      assembly_.requestFactory()->searchRequest(*request_, bag.get(), guid, state_->fieldMask());
  if (!request) {
    _reply(std::nullopt, zelkorError(kBagFault, "no URL"));
    return;
  }
  start_ = startNetworkFeedback(*request, request_->queryString, request_->triggerEvent,
                                kSearchEndpoint);
  state_->record(start_, *request_, guid);
  _sendRequest(*request);
}

void SearchFlow::_sendRequest(const URLRequest& request) {
  if (_log().isEnabled(LogLevel::Debug)) {
    const bool show = assembly_.platform().log.showsPrivateData();
    _log().debug("request: {} header: {}", urlForLog(request.url, show),
                 priv(headersForLog(request.headers)));
  }
  httpRequest_ = request;
  const auto task = assembly_.urlSession().dataTask(
      request, [self = shared_from_this()](const auto& finished, const URLResult& result) {
        self->_finish(finished, result);
      });
  useRoutingProxy(assembly_, *task);
  task->resume();
  assembly_.reporter().addValue(1, "com.quenta.zelkord.search");
  state_->_setPerformedSearch();
  state_->_markNetworkRequest();
}

void SearchFlow::_finish(const std::shared_ptr<URLTask>& task, const URLResult& result) {
  const bool isHTTP = result.response && result.response->status;
  if (isHTTP) state_->recordSearchResult(result.status());
  _log().notice("Got network response for (id, query): ({}, {})", request_->queryId,
                priv(request_->queryString));
  if (_log().isEnabled(LogLevel::Debug)) {
    _log().debug("resp: {}",
                 responseForLog(result.response, assembly_.platform().log.showsPrivateData()));
  }
  if (result.error) {
    _log().error("error with request {}", result.error->description());
    _fail(*task, result, *result.error);
  } else if (!isHTTP) {
    _log().error("not http response? {}",
                 responseForLog(result.response, assembly_.platform().log.showsPrivateData()));
    _fail(*task, result, zelkorError(kConnectionFault, "invalid response class"));
  } else {
    _accept(task, result);
  }
}

void SearchFlow::_fail(const URLTask& task, const URLResult& result, Error error) {
  failSearchFeedback(*state_, error, *request_, start_, result, task.timingData());
  _reply(std::nullopt, std::move(error));
}

void SearchFlow::_accept(const std::shared_ptr<URLTask>& task, const URLResult& result) {
  const auto data = result.data.value_or(Data());
  const auto rawResponse = parseJson(data.view());
  if (rawResponse) _cacheResponse(*rawResponse, data);
  endNetworkFeedback(state_, start_, rawResponse ? &*rawResponse : nullptr, result, task,
                     request_->queryId);
  auto reply = _makeReply(data);
  if (request_->verboseReply) addHTTPExchange(reply, httpRequest_, *result.response);
  _forceFetchBag(*result.response);
  _reply(std::move(reply), std::nullopt);
}

void SearchFlow::_cacheResponse(const json::value& rawResponse, const Data& data) {
  auto* cache = state_->queryCache();
  const auto* entries = rawResponse.if_array();
  if (!cache || !entries || request_->queryString.empty()) return;
  const auto now = assembly_.platform().clock.now();
  std::vector<CachedResultSet::Pointer> resultSets;
  for (const auto& entry : *entries) {
    const auto* resultSet = entry.if_object();
    if (!resultSet || stringIn(*resultSet, "status") == "ERROR") continue;
    resultSets.emplace_back(new CachedResultSet(request_->queryString, httpRequest_, *resultSet,
                                                request_->uuid, data, now));
  }
  cache->set(std::move(resultSets));
}

void SearchFlow::_forceFetchBag(const URLResponse& response) {
  const auto header = response.header("X-Quenta-ForceFetch");
  if (!header) return;
  const auto value = isValidUtf8(*header) ? parseJson(*header) : std::nullopt;
  if (const auto* dictionary = value ? value->if_object() : nullptr) {
    assembly_.bagController()->forceFetchBag(*dictionary);
  } else {
    _log().error("Failed to deserialize X-Quenta-ForceFetch header data into a dictionary: {}",
                 priv(*header));
  }
}

void SearchFlow::_skip(SkipReason reason) {
  state_->record(std::make_shared<ZLKSkipSearchFeedback>(static_cast<std::uint32_t>(reason),
                                                         request_->queryString),
                 *request_, state_->guidController().currentUserGUID());
}

ZLKReply SearchFlow::_makeReply(Data data) const {
  ZLKReply reply;
  reply.scale = request_->scale;
  reply.data = std::move(data);
  const auto session = assembly_.requestFactory()->getMapsUserSessionEntityAndReset(false);
  if (session) reply.geoSessionEntityString = session->sessionEntityString();
  return reply;
}

void SearchFlow::_reply(std::optional<ZLKReply> reply, std::optional<Error> error) {
  reply_(request_->queryId, std::move(reply), std::move(error));
}

const Logger& SearchFlow::_log() const { return assembly_.log(Category::Search); }

}  // namespace zelkord
