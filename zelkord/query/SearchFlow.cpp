#include "zelkord/query/SearchFlow.h"

#include <utility>

#include "base/Text.h"
#include "halvane/DaemonFeedback.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/feedback/UserGUIDSource.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/query/QueryCache.h"

namespace zelkord {
namespace {

constexpr std::int32_t kCacheHitTrigger = 4;
// Of one response, handed to the cache together. Each carries the typed text, so that a long list
// is not built as a whole.
constexpr std::size_t kSetsAtOnce = 256;

// Entries without a query complete nothing: the cache would ignore them.
bool mayBeCached(const json::object& resultSet) {
  const auto* query = resultSet.if_contains("query");
  if (!query || !query->is_string() || query->get_string().empty()) return false;
  return stringIn(resultSet, "status") != "ERROR";
}

}  // namespace

bool SearchFlow::_passesGates() {
  state_->count("keystrokes");
  return BagGatedFlow::_passesGates() && _isLongEnough() && !_answersFromCache();
}

bool SearchFlow::_isLongEnough() {
  if (utf16Length(request_->queryString) >= state_->currentBag()->minimumQueryLength()) return true;
  _log().debug("query[{}] input '{}' less than minQueryLength", request_->queryId,
               priv(request_->queryString));
  _skip(SkipReason::TooShort);
  return false;
}

bool SearchFlow::_answersFromCache() {
  auto* cache = state_->queryCache();
  if (!cache) return false;
  // First, for it may be a new one.
  userGuid_ = state_->guidController().currentUserGUID();
  const auto cached = cache->getRequest(*request_, *userGuid_);
  if (!cached || !request_->queryItems.empty()) return false;
  auto reply = _makeReply(cached->data());
  state_->count("ondevicecachehits");
  state_->record(std::make_shared<ZLKCacheHitFeedback>(kCacheHitTrigger, request_->queryString,
                                                       cached->uuid()),
                 *request_, userGuid_);
  _reply(std::move(reply), std::nullopt);
  return true;
}

void SearchFlow::_didSend() {
  assembly_.reporter().addValue(1, "com.quenta.zelkord.search");
  state_->_setPerformedSearch();
}

void SearchFlow::_didParse(const json::value& rawResponse, const Data& data) {
  _cacheResponse(rawResponse, data);
}

void SearchFlow::_cacheResponse(const json::value& rawResponse, const Data& data) {
  auto* cache = state_->queryCache();
  const auto* entries = rawResponse.if_array();
  if (!cache || !entries || request_->queryString.empty()) return;
  if (userGuid_ != state_->guidController().currentUserGUID()) return;
  const auto response =
      std::make_shared<const FetchedResponse>(request_->queryString, httpRequest_, request_->uuid,
                                              data, assembly_.platform().clock.now(), *userGuid_);
  std::vector<CachedResultSet::Pointer> resultSets;
  for (const auto& entry : *entries) {
    const auto* resultSet = entry.if_object();
    if (!resultSet || !mayBeCached(*resultSet)) continue;
    resultSets.emplace_back(new CachedResultSet(response, *resultSet));
    if (resultSets.size() == kSetsAtOnce) cache->set(std::exchange(resultSets, {}));
  }
  cache->set(std::move(resultSets));
}

void SearchFlow::_willReply(const URLResponse& response) { _forceFetchBag(response); }

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

void SearchFlow::_logStart() const {
  _log().notice("session {} performing query[{}] {}, reply {}", state_->identifier(),
                static_cast<std::uint64_t>(request_->queryId), priv(request_->queryString),
                kCallbackText);
}

void SearchFlow::_logNoBag() const {
  _log().error("Bag fetch failed, can't complete non-cached query {}.",
               priv(request_->queryString));
}

void SearchFlow::_logDispatch() const {
  _log().debug("Dispatching network request for (id, query): ({}, {})", request_->queryId,
               priv(request_->queryString));
}

void SearchFlow::_logAnswer() const {
  _log().notice("Got network response for (id, query): ({}, {})", request_->queryId,
                priv(request_->queryString));
}

}  // namespace zelkord
