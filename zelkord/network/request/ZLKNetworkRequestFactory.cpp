#include "zelkord/network/request/ZLKNetworkRequestFactory.h"

#include <utility>

#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/network/bag/BagFollower.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/context/AppSignatureSource.h"
#include "zelkord/network/context/ContextUpdater.h"
#include "zelkord/network/context/HeaderJson.h"
#include "zelkord/network/context/LocationController.h"
#include "zelkord/network/context/RequestContextStore.h"
#include "zelkord/network/request/RequestItems.h"
#include "zelkord/network/request/ZelkorURLRequestBuilder.h"

namespace zelkord {
namespace {

constexpr Duration kTimeoutWithoutBag = 30s;

std::optional<std::string> ownOr(const std::string& own, std::optional<std::string> bags) {
  return own.empty() ? std::move(bags) : own;
}

std::optional<std::string> topicsHeader(const std::string& topics) {
  if (topics.empty()) return std::nullopt;
  const auto parsed = parseJson(topics);
  return parsed ? headerJson(*parsed) : std::nullopt;
}

}  // namespace

ZLKNetworkRequestFactory::ZLKNetworkRequestFactory(Assembly& assembly)
    : assembly_(assembly),
      zelkordUserAgent_(zelkordUserAgent(assembly.platform().device)),
      downloadUserAgent_(createUserAgentString("Lanthe/1", assembly.platform().device)),
      context_(std::make_shared<RequestContextStore>(assembly.platform().queues)),
      location_(std::make_shared<LocationController>(assembly, context_)),
      updater_(std::make_shared<ContextUpdater>(assembly, context_,
                                                static_cast<const BagRequests*>(this))),
      bagFollower_(std::make_shared<BagFollower>(assembly, context_, location_)) {}

ZLKNetworkRequestFactory::~ZLKNetworkRequestFactory() = default;

void ZLKNetworkRequestFactory::start() {
  location_->initLocationServices();
  updater_->start();
  bagFollower_->start();
  guidObserver_ = assembly_.notificationCenter().observe(
      std::string(kZLKUserGUIDChangeNotification),
      [&assembly = assembly_](const Notification&) { assembly.mapsSessions().identityChanged(); });
}

std::optional<URLRequest> ZLKNetworkRequestFactory::searchRequest(
    const ZLKRequest& query, const ZLKBag* bag, const std::optional<UUID>& userGuid,
    FieldMask fieldMask) {
  RequestInputs inputs{.assembly = assembly_, .query = &query, .bag = bag};
  inputs.userGuid = userGuid;
  inputs.fieldMask = fieldMask;
  inputs.topics = topicsHeader(query.topics);
  return _queryRequest(kSearchRecipe, inputs, bag ? bag->searchURL() : std::nullopt);
}

std::optional<URLRequest> ZLKNetworkRequestFactory::zeroKeywordRequest(
    const ZLKRequest& query, const ZLKBag* bag, const std::optional<UUID>& userGuid,
    FieldMask fieldMask) {
  RequestInputs inputs{.assembly = assembly_, .query = &query, .bag = bag};
  inputs.userGuid = userGuid;
  inputs.fieldMask = fieldMask;
  return _queryRequest(kZeroKeywordRecipe, inputs, bag ? bag->searchURL() : std::nullopt);
}

std::optional<URLRequest> ZLKNetworkRequestFactory::moreResultsRequest(
    const ZLKMoreResultsRequest& query, const ZLKBag* bag, const std::optional<UUID>& userGuid,
    FieldMask fieldMask) {
  RequestInputs inputs{.assembly = assembly_, .query = &query, .bag = bag};
  inputs.userGuid = userGuid;
  inputs.fieldMask = fieldMask;
  return _queryRequest(kMoreResultsRecipe, inputs,
                       ownOr(query.moreResultsURL, bag ? bag->moreResultsURL() : std::nullopt));
}

std::optional<URLRequest> ZLKNetworkRequestFactory::lookupRequest(
    const ZLKLookupRequest& query, const ZLKBag* bag, const std::optional<UUID>& userGuid) {
  const auto url = bag ? bag->searchURL() : std::nullopt;
  if (!url) return std::nullopt;
  RequestInputs inputs{.assembly = assembly_, .query = &query, .lookup = &query, .bag = bag};
  inputs.userGuid = userGuid;
  inputs.queryLanguage = _languageOf(query.queryString);
  inputs.contextLanguage = _languageOf(query.queryContext);
  return _queryRequest(kLookupRecipe, inputs, url);
}

std::optional<URLRequest> ZLKNetworkRequestFactory::cardRequest(
    const ZLKCardRequest& query, const ZLKBag* bag, const std::optional<UUID>& userGuid) {
  RequestInputs inputs{.assembly = assembly_, .query = &query, .bag = bag};
  inputs.userGuid = userGuid;
  return _queryRequest(kCardRecipe, inputs,
                       ownOr(query.cardURL, bag ? bag->cardURL() : std::nullopt));
}

std::optional<URLRequest> ZLKNetworkRequestFactory::_queryRequest(
    const RequestRecipe& recipe, RequestInputs& inputs, const std::optional<std::string>& url) {
  auto builder = url ? ZelkorURLRequestBuilder::make(*url) : std::nullopt;
  if (!builder) return std::nullopt;
  if (inputs.bag) inputs.userAgent = inputs.bag->userAgent();
  const bool withheld = (inputs.fieldMask & kFieldMaskWithholdLocation) != 0;
  const auto* signature = appSignature_.load(std::memory_order_acquire);
  if (signature && !withheld) inputs.appSignature = signature->signature();

  const bool hasLocation = recipe.locationRefresh == LocationRefresh::UnlessInURL &&
                           builder->containsQueryItemWithName("latlng");
  _addItems(recipe, inputs, *builder,
            recipe.locationRefresh != LocationRefresh::Never && !hasLocation);
  auto request = builder->createUrlRequest();
  request.timeout = inputs.bag ? inputs.bag->timeoutIntervalForRequest() : kTimeoutWithoutBag;
  const bool routes = recipe.routing == RequestRouting::UnlessWithheld && !withheld;
  return routes && _routingIsOn() ? routedForm(std::move(request)) : request;
}

// In the usual case, when nothing about the location changes first, this takes one read.
void ZLKNetworkRequestFactory::_addItems(const RequestRecipe& recipe, const RequestInputs& inputs,
                                         ZelkorURLRequestBuilder& builder, bool refreshLocation) {
  auto need = LocationNeed::Nothing;
  context_->read([&](const RequestContext& context) {
    if (refreshLocation) need = context.location.need(assembly_.platform().clock.now());
    if (need != LocationNeed::MarkSlowAndAsk) addItems(recipe, inputs, context, builder);
  });
  if (need == LocationNeed::Ask) location_->askForFix();
  if (need != LocationNeed::MarkSlowAndAsk) return;
  location_->startUpdatingLocation();
  context_->read(
      [&](const RequestContext& context) { addItems(recipe, inputs, context, builder); });
}

std::optional<URLRequest> ZLKNetworkRequestFactory::warmRequest(const std::string& url) const {
  if (url.empty()) return std::nullopt;
  URLRequest request{.url = url, .cachePolicy = CachePolicy::ReloadIgnoringLocalCache};
  return _routingIsOn() ? routedForm(std::move(request)) : request;
}

std::optional<URLRequest> ZLKNetworkRequestFactory::fileDownloadRequest(const std::string& url,
                                                                        const std::string& version,
                                                                        bool includeLatLong) const {
  RequestInputs inputs{.assembly = assembly_};
  inputs.userAgent = downloadUserAgent_;
  inputs.version = version;
  inputs.includeLatLong = includeLatLong;
  return _plainRequest(kFileDownloadRecipe, inputs, url);
}

std::optional<URLRequest> ZLKNetworkRequestFactory::flusherUploadRequest(
    const std::string& url, Duration timeout, const std::string& digest) const {
  RequestInputs inputs{.assembly = assembly_};
  inputs.userAgent = zelkordUserAgent_;
  inputs.digest = digest;
  auto request = _plainRequest(kFlusherUploadRecipe, inputs, url);
  if (!request) return std::nullopt;
  request->method = "POST";
  request->cachePolicy = CachePolicy::ReloadIgnoringLocalCache;
  request->timeout = timeout;
  return request;
}

std::optional<URLRequest> ZLKNetworkRequestFactory::_plainRequest(const RequestRecipe& recipe,
                                                                  const RequestInputs& inputs,
                                                                  const std::string& url) const {
  auto builder = ZelkorURLRequestBuilder::make(url);
  if (!builder) return std::nullopt;
  context_->read(
      [&](const RequestContext& context) { addItems(recipe, inputs, context, *builder); });
  return builder->createUrlRequest();
}

URLRequest ZLKNetworkRequestFactory::bagFetchRequest(const ZelkorBagController& controller,
                                                     const std::optional<std::string>& userAgent,
                                                     const std::optional<std::string>& version) {
  auto request = _bagRequest(kBagFetchRecipe, controller, userAgent, version);
  request.cachePolicy = CachePolicy::ReloadIgnoringLocalCache;
  return request;
}

URLRequest ZLKNetworkRequestFactory::bagCacheRequest(const ZelkorBagController& controller,
                                                     const std::optional<std::string>& userAgent,
                                                     const std::optional<std::string>& version) {
  return _bagRequest(kBagCacheRecipe, controller, userAgent, version);
}

URLRequest ZLKNetworkRequestFactory::_bagRequest(const RequestRecipe& recipe,
                                                 const ZelkorBagController& controller,
                                                 const std::optional<std::string>& userAgent,
                                                 const std::optional<std::string>& version) const {
  RequestInputs inputs{.assembly = assembly_};
  inputs.userAgent = userAgent;
  inputs.version = version;
  inputs.useMorvane = assembly_.useMorvane();
  URLRequest request;
  context_->read([&](const RequestContext& context) {
    const auto url = controller.bagFetchURLWithCountry(context.deviceCountryCode);
    auto builder = ZelkorURLRequestBuilder::make(url);
    if (!builder) {
      request.url = url;
      return;
    }
    addItems(recipe, inputs, context, *builder);
    request = builder->createUrlRequest();
  });
  return request;
}

std::uint64_t ZLKNetworkRequestFactory::contextGeneration() const { return context_->generation(); }

void ZLKNetworkRequestFactory::didUpdateSubscriptionDictionaries(json::array subscriptions) {
  auto info = subscriptions.empty() ? std::nullopt : headerJson(subscriptions);
  context_->update([info = std::move(info)](RequestContext& context) {
    context.subscriptionInfo = info.value_or("");
  });
}

void ZLKNetworkRequestFactory::didUpdateStorefrontIdentifier(
    std::optional<std::string> identifier) {
  context_->update([identifier = std::move(identifier)](RequestContext& context) {
    context.storefrontIdentifier = identifier.value_or("");
  });
}

std::optional<MapsUserSession> ZLKNetworkRequestFactory::getMapsUserSessionEntityAndReset(
    bool reset, const std::optional<UUID>& userGuid) const {
  auto identifier = reset ? assembly_.platform().maps.userSession(true)
                          : assembly_.mapsSessions().ofReply(userGuid);
  if (!identifier) return std::nullopt;
  return MapsUserSession{std::move(*identifier)};
}

void ZLKNetworkRequestFactory::setPerformedSearch() {
  // Nothing changes after the first search with a fix, so the usual search costs one read.
  bool changes = false;
  context_->read([&](const RequestContext& context) {
    const auto& location = context.location;
    changes = location.fix && location.lookupLatLng != location.latLng;
  });
  if (!changes) return;
  context_->update([](RequestContext& context) { context.location.setPerformedSearch(); });
}

void ZLKNetworkRequestFactory::setAppSignatureSource(const AppSignatureSource* source) {
  appSignature_.store(source, std::memory_order_release);
}

std::optional<std::string> ZLKNetworkRequestFactory::_languageOf(const std::string& text) const {
  if (text.empty()) return std::nullopt;
  auto tag = assembly_.platform().tagger.languageAtStart(text);
  if (tag.empty() || tag == "und") return std::nullopt;
  return tag;
}

bool ZLKNetworkRequestFactory::_routingIsOn() const {
  return assembly_.useMorvane() && assembly_.platform().networkProxy.isEnabled();
}

}  // namespace zelkord
