// What a search pays for its request: all items and headers, the context read on real queues.
//
// Floors: the one idle `sync` that reads the context, and a copy of the finished request.

#include <benchmark/benchmark.h>

#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformOnQueues.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/NotificationNames.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"

namespace zelkord {
namespace {

// A factory that knows its device, and a query that fills every item it can.
struct BenchedFactory {
  LinuxClock clock;
  FakePlatform fakes;  // outlives the queues' threads
  LinuxWorkQueues queues{clock};
  Platform platform =
      onQueues(fakes.platform(), clock, queues, fakes.urlSessions, fakes.transactions);
  Assembly assembly{platform};
  std::shared_ptr<const ZLKBag> bag =
      std::make_shared<ZLKBag>(std::make_shared<const json::object>(json::object{
                                   {"search_url", "https://api.service.example/search?v=2"},
                                   {"card_url", "https://api.service.example/card"},
                                   {"supported_geo_location_sources", {"gps", "wifi"}},
                                   {"send_geo_environment_header", true}}),
                               "Lanthe/3.1 (phone)");
  ZLKSearchRequest query;
  ZLKLookupRequest lookup;
  UUID guid = UUID::fromRandomBytes({});
  ZLKNetworkRequestFactory* factory = nullptr;

  BenchedFactory() {
    fakes.settings.registerDefaults({{"ZLKUseMorvane", true}});
    fakes.maps.metadata = "bWV0YWRhdGEgb2YgdGhlIG1hcHMgY2xpZW50";
    fakes.maps.environment = "production";
    fakes.location.setAuthorization("/System/Library/LocationBundles/CoreZelkor.framework", 3);
    assembly.requestFactory.set(std::make_shared<ZLKNetworkRequestFactory>(assembly));
    factory = assembly.requestFactory();
    factory->start();
    factory->didUpdateStorefrontIdentifier("143441-1,29");
    factory->didUpdateSubscriptionDictionaries({{{"provider", "acme"}, {"tier", 2}}});
    assembly.bagController.set(std::make_shared<ZelkorBagController>(assembly, *factory));
    query.queryString = "caf\xC3\xA9 in Paris";
    query.keyboardInputMode = "en_US@sw=QWERTY";
    query.scale = 2;
    lookup.queryString = query.queryString;
    lookup.appBundleId = "com.example.reader";
  }
};

// The main queue runs until the device has a fix.
void locate(BenchedFactory& benched) {
  auto& center = benched.fakes.notificationCenter;
  center.post({std::string(kZLKBagChangeNotification), nullptr, {{"bag", benched.bag}}});
  auto& main = benched.queues.main();
  bool delivered = false;
  std::function<void()> step = [&] {
    if (benched.fakes.location.updating() > 0) {
      const LocationFix fix{
          .latitude = 37.77, .longitude = -122.4, .type = 1, .time = benched.clock.now()};
      benched.fakes.location.deliver({fix});
      delivered = true;
    }
    main.async(delivered ? Task([&] { benched.queues.stopMainLoop(); }) : Task(step));
  };
  main.async(step);
  benched.queues.runMainLoop();
}

void BM_SearchRequest(benchmark::State& state) {
  BenchedFactory benched;
  if (state.range(0) != 0) locate(benched);
  for (auto _ : state) {
    benchmark::DoNotOptimize(
        benched.factory->searchRequest(benched.query, benched.bag.get(), benched.guid));
  }
}
BENCHMARK(BM_SearchRequest)->ArgName("located")->Arg(0)->Arg(1);

void BM_SearchRequestWithTopics(benchmark::State& state) {
  BenchedFactory benched;
  benched.query.topics = R"([{"topic":"music","weight":0.5},{"topic":"travel","weight":0.25}])";
  for (auto _ : state) {
    benchmark::DoNotOptimize(
        benched.factory->searchRequest(benched.query, benched.bag.get(), benched.guid));
  }
}
BENCHMARK(BM_SearchRequestWithTopics);

// Without the cost of detecting languages.
void BM_LookupRequest(benchmark::State& state) {
  BenchedFactory benched;
  for (auto _ : state) {
    benchmark::DoNotOptimize(
        benched.factory->lookupRequest(benched.lookup, benched.bag.get(), benched.guid));
  }
}
BENCHMARK(BM_LookupRequest);

void BM_BagCacheRequest(benchmark::State& state) {
  BenchedFactory benched;
  const auto& controller = *benched.assembly.bagController();
  for (auto _ : state) {
    benchmark::DoNotOptimize(benched.factory->bagCacheRequest(controller, "Agent/1", {}));
  }
}
BENCHMARK(BM_BagCacheRequest);

void BM_PerformedSearchAgain(benchmark::State& state) {
  BenchedFactory benched;
  for (auto _ : state) benched.factory->setPerformedSearch();
}
BENCHMARK(BM_PerformedSearchAgain);

void BM_ReadContextFloor(benchmark::State& state) {
  BenchedFactory benched;
  const auto queue = benched.queues.makeConcurrentQueue("floor");
  int value = 0;
  for (auto _ : state) queue->sync([&value] { benchmark::DoNotOptimize(++value); });
}
BENCHMARK(BM_ReadContextFloor);

void BM_CopyRequestFloor(benchmark::State& state) {
  BenchedFactory benched;
  const auto request =
      *benched.factory->searchRequest(benched.query, benched.bag.get(), benched.guid);
  for (auto _ : state) {
    auto copy = request;
    benchmark::DoNotOptimize(copy);
  }
}
BENCHMARK(BM_CopyRequestFloor);

}  // namespace
}  // namespace zelkord
