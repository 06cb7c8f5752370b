// What a search pays for the bag, the identifier and the building of its request.
//
// Floors: an idle `sync` for the readers of queue state, a copy of the finished request for the
// builder.

#include <benchmark/benchmark.h>

#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformOnQueues.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/bag/BagRequests.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/context/ZelkorUserGUIDController.h"
#include "zelkord/network/request/ZelkorURLRequestBuilder.h"

namespace zelkord {
namespace {

constexpr std::string_view kSearchItems[] = {
    "qtype", "key",       "card",  "cc",   "locale", "esl",    "kb_ime", "calendar",
    "q",     "time_zone", "units", "temp", "24h",    "latlng", "geosrc", "mode"};
constexpr std::string_view kSearchHeaders[] = {"X-Quenta-TopTopics",
                                               "X-Quenta-Languages",
                                               "X-Quenta-GeoMetadata",
                                               "X-Quenta-GeoSession",
                                               "X-Quenta-GeoEnvironment",
                                               "X-Quenta-UserGuid",
                                               "X-Quenta-UI-Scale",
                                               "X-Quenta-Subscriptions",
                                               "User-Agent",
                                               "X-Quenta-Whitelisted-App-Signature"};

class SteadyBagRequests final : public BagRequests {
 public:
  URLRequest bagFetchRequest(const ZelkorBagController&, const std::optional<std::string>&,
                             const std::optional<std::string>&) override {
    return {.url = "https://host/bag"};
  }
  URLRequest bagCacheRequest(const ZelkorBagController&, const std::optional<std::string>&,
                             const std::optional<std::string>&) override {
    return {.url = "https://host/bag?cc=DE&esl=de&locale=de_DE&morvane=1"};
  }
  std::uint64_t contextGeneration() const override { return 1; }
};

// The services on real queues and clocks.
struct BenchedServices {
  LinuxClock clock;
  FakePlatform fakes;  // outlives the queues' threads
  LinuxWorkQueues queues{clock};
  FakeURLSessions sessions{queues};
  CountedTransactions transactions{clock};
  Platform platform = onQueues(fakes.platform(), clock, queues, sessions, transactions);
  Assembly assembly{platform};
  SteadyBagRequests requests;
  std::shared_ptr<ZelkorBagController> bag =
      std::make_shared<ZelkorBagController>(assembly, requests);
  ZelkorUserGUIDController guids{assembly};

  BenchedServices() {
    json::object document{{"version", 12}, {"search_url", "https://host/search"}};
    for (int i = 0; i < 40; ++i) document["key_" + std::to_string(i)] = "value";
    bag->cacheBagState(
        std::make_shared<const ZLKBag>(bag->cacheBagDictionary(document), std::nullopt),
        BagOrigin::Network);
  }
};

void BM_IdleSync(benchmark::State& state) {
  BenchedServices services;
  const auto queue = services.queues.makeSerialQueue("floor");
  int value = 0;
  for (auto _ : state) {
    queue->sync([&value] { benchmark::DoNotOptimize(++value); });
  }
}
BENCHMARK(BM_IdleSync);

void BM_CurrentUserGUID(benchmark::State& state) {
  BenchedServices services;
  for (auto _ : state) benchmark::DoNotOptimize(services.guids.currentUserGUID());
}
BENCHMARK(BM_CurrentUserGUID);

void BM_InMemoryBag(benchmark::State& state) {
  BenchedServices services;
  for (auto _ : state) benchmark::DoNotOptimize(services.bag->inMemoryBag());
}
BENCHMARK(BM_InMemoryBag);

// Refresh rule included, bag fresh.
void BM_CurrentBag(benchmark::State& state) {
  BenchedServices services;
  for (auto _ : state) benchmark::DoNotOptimize(services.bag->currentBag());
}
BENCHMARK(BM_CurrentBag);

URLRequest buildSearch(std::string_view text) {
  auto builder = *ZelkorURLRequestBuilder::make("https://host/search?partner=abc&v=3");
  for (const auto name : kSearchItems) {
    builder.defaultQueryItemWithName(name, std::string(text));
  }
  for (const auto name : kSearchHeaders) {
    builder.defaultHttpHeaderWithName(name, "some value that is longer than a few characters");
  }
  return builder.createUrlRequest();
}

void BM_BuildSearchRequest(benchmark::State& state) {
  for (auto _ : state) benchmark::DoNotOptimize(buildSearch("caf\xC3\xA9 in Paris"));
}
BENCHMARK(BM_BuildSearchRequest);

void BM_CopySearchRequest(benchmark::State& state) {
  const auto request = buildSearch("caf\xC3\xA9 in Paris");
  for (auto _ : state) {
    auto copy = request;
    benchmark::DoNotOptimize(copy);
  }
}
BENCHMARK(BM_CopySearchRequest);

}  // namespace
}  // namespace zelkord
