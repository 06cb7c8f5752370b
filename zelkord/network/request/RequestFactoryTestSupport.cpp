#include "zelkord/network/request/RequestFactoryTestSupport.h"

#include "zelkord/assembly/NotificationNames.h"

namespace zelkord {

class FactoryWorld::Signature final : public AppSignatureSource {
 public:
  explicit Signature(const std::optional<std::string>& signature) : signature_(signature) {}
  std::optional<std::string> signature() const override { return signature_; }

 private:
  const std::optional<std::string>& signature_;
};

namespace {

const std::shared_ptr<const json::object>& bagOfTheWorld() {
  static const auto dictionary = std::make_shared<const json::object>(json::object{
      {"search_url", "https://service.example/search?v=2"},
      {"more_results_url", "https://service.example/more"},
      {"card_url", "https://service.example/card"},
      {"timeout_interval_for_request", 12},
      {"send_geo_environment_header", true},
      {"client_name", "lanthe"},
      {"supported_geo_location_sources", {"gps", "wifi"}},
      {"morvane_configuration", {{"proxy", "https://proxy.example:443"}}},
  });
  return dictionary;
}

}  // namespace

FactoryWorld::FactoryWorld()
    : assembly(fake.platform()),
      bag(std::make_shared<ZLKBag>(bagOfTheWorld(), "Lanthe/3.1")),
      signatureSource_(std::make_unique<Signature>(signature)) {
  fake.settings.registerDefaults({{"ZLKUseMorvane", true}});
  fake.locale.snapshot = {"de_DE",
                          "gregorian",
                          "Metric",
                          "HH",
                          "Celsius",
                          "Fahrenheit",
                          {"de-DE", "en-GB", "fr-FR", "it-IT"},
                          "de"};
  fake.locale.zone = "Europe/Berlin";
  fake.maps.country = "DE";
  fake.maps.metadata = "bWV0YWRhdGE=";
  fake.maps.environment = "production";
  fake.accounts.managed = true;
  fake.management.diagnosticsSubmission = RestrictionValue::Yes;
  fake.location.setAuthorization("/System/Library/LocationBundles/CoreZelkor.framework", 3);
  fake.tagger.languages = {{"schöne Straße", "de"}, {"a long way", "en"}};
  subscriptions = {{{"provider", "acme"}, {"tier", 2}}};
  eachQuery([](ZLKRequest& query) {
    query.queryString = "c++ & ü;x";
    query.triggerEvent = 8;
    query.queryItems = {{"client", "1"}};
    query.keyboardInputMode = "de_DE@sw=QWERTZ";
    query.scale = 2;
    query.topics = R"([ {"topic": "a/b", "weight": 0.5} ])";
  });
  lookup.queryString = "schöne Straße";
  lookup.queryContext = "a long way";
  lookup.appBundleId = "com.example.reader";
  lookup.domain = "books";
  lookup.lookupSelectionType = 2;
}

FactoryWorld::~FactoryWorld() = default;

void FactoryWorld::eachQuery(const std::function<void(ZLKRequest&)>& change) {
  for (auto* query : {static_cast<ZLKRequest*>(&search), static_cast<ZLKRequest*>(&zeroKeyword),
                      static_cast<ZLKRequest*>(&moreResults), static_cast<ZLKRequest*>(&lookup),
                      static_cast<ZLKRequest*>(&card)}) {
    change(*query);
  }
}

void FactoryWorld::setBag(const std::string& key, json::value value) {
  auto dictionary = *bag->rawBag();
  dictionary[key] = std::move(value);
  bag = std::make_shared<ZLKBag>(std::make_shared<const json::object>(std::move(dictionary)),
                                 bag->userAgent());
}

void FactoryWorld::startWithoutBag() {
  assembly.requestFactory.set(std::make_shared<ZLKNetworkRequestFactory>(assembly));
  factory().start();
  factory().setAppSignatureSource(signatureSource_.get());
  factory().didUpdateSubscriptionDictionaries(subscriptions);
  factory().didUpdateStorefrontIdentifier(storefront);
  assembly.bagController.set(std::make_shared<ZelkorBagController>(assembly, factory()));
  fake.timeline.runUntilIdle();
}

void FactoryWorld::start() {
  startWithoutBag();
  postBag();
  if (fixType) deliverFix(*fixType);
}

void FactoryWorld::postBag() {
  fake.notificationCenter.post({std::string(kZLKBagChangeNotification), nullptr, {{"bag", bag}}});
  fake.timeline.runUntilIdle();
}

void FactoryWorld::deliverFix(int type) {
  fake.location.deliver({{.latitude = 37.7749,
                          .longitude = -122.4194,
                          .horizontalAccuracy = 65,
                          .type = type,
                          .time = fake.timeline.now()}});
  fake.timeline.runUntilIdle();
}

void FactoryWorld::notify(std::string_view name) {
  fake.notificationCenter.post(std::string(name));
  fake.timeline.runUntilIdle();
}

const std::vector<std::string_view>& FactoryWorld::kinds() {
  static const std::vector<std::string_view> names = {
      "search", "zeroKeyword", "moreResults", "lookup",       "card",
      "warm",   "bagFetch",    "bagCache",    "fileDownload", "flusherUpload"};
  return names;
}

std::optional<URLRequest> FactoryWorld::request(std::string_view kind) {
  auto& make = factory();
  const auto& controller = *assembly.bagController();
  if (kind == "search") return make.searchRequest(search, bag.get(), userGuid, fieldMask);
  if (kind == "zeroKeyword") {
    return make.zeroKeywordRequest(zeroKeyword, bag.get(), userGuid, fieldMask);
  }
  if (kind == "moreResults") {
    return make.moreResultsRequest(moreResults, bag.get(), userGuid, fieldMask);
  }
  if (kind == "lookup") return make.lookupRequest(lookup, bag.get(), userGuid);
  if (kind == "card") return make.cardRequest(card, bag.get(), userGuid);
  if (kind == "warm") return make.warmRequest("https://service.example/warm?w=1");
  if (kind == "bagFetch") return make.bagFetchRequest(controller, "Agent/1", "17");
  if (kind == "bagCache") return make.bagCacheRequest(controller, "Agent/1", "17");
  if (kind == "fileDownload") {
    return make.fileDownloadRequest("https://files.example/hints?f=1", "etag-9", includeLatLong);
  }
  return make.flusherUploadRequest("https://service.example/upload", 300s, "digest0");
}

}  // namespace zelkord
