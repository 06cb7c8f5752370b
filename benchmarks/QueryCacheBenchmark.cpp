// What looking up the answer to a keystroke costs when it is there: from the request to the chosen
// entry, in a cache that is as full of small entries as it gets.
//
// An idle `sync`, with which every look-up begins, is BM_IdleSync.

#include <benchmark/benchmark.h>

#include <algorithm>
#include <map>

#include "benchmarks/QuietLog.h"
#include "benchmarks/maps/Completions.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformOnQueues.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/query/QueryCache.h"

namespace zelkord {
namespace {

// 2 MiB by 1,024 bytes and a body of one each.
constexpr std::size_t kEntries = 2'045;

// A cache of completions that were fetched for their first letter.
struct FullCache {
  LinuxClock clock;
  FakePlatform fakes;  // outlives the queues' threads
  LinuxWorkQueues queues{clock};
  FakeURLSessions sessions{queues};
  CountedTransactions transactions{clock};
  QuietLog log;
  Platform platform = onQueues(fakes.platform(), clock, queues, sessions, transactions, &log);
  Assembly assembly{platform};
  std::shared_ptr<QueryCache> cache = std::make_shared<QueryCache>(assembly);
  std::map<std::string, std::size_t> firstLetters;  // and how many entries each has

  FullCache() {
    for (const auto& query : bench::completions(kEntries)) {
      if (query.front() < 'a' || query.front() > 'z') continue;
      add(query.substr(0, 1), query);
    }
    if (cache->count() != stored()) std::abort();
  }

  void add(const std::string& input, const std::string& query) {
    ++firstLetters[input];
    const json::object resultSet = {
        {"query", query}, {"completion_score", 0.5}, {"max_age", 3'600}};
    const auto response = std::make_shared<const FetchedResponse>(input, URLRequest(), "uuid",
                                                                  Data("x"), clock.now());
    cache->set(CachedResultSet::Pointer(new CachedResultSet(response, resultSet)));
  }
  std::size_t stored() const {
    std::size_t sum = 0;
    for (const auto& [letter, entries] : firstLetters) sum += entries;
    return sum;
  }
};

void look(FullCache& full, const std::vector<std::string>& texts, benchmark::State& state) {
  ZLKSearchRequest request;
  request.scale = 0;
  std::size_t next = 0;
  for (auto _ : state) {
    request.queryString = texts[next++ % texts.size()];
    const auto found = full.cache->getRequest(request);
    if (!found) state.SkipWithError("nothing found");
    benchmark::DoNotOptimize(found.get());
  }
}

// Every first letter in turn.
void BM_CacheHitOfOneLetter(benchmark::State& state) {
  FullCache full;
  std::vector<std::string> letters;
  for (const auto& [letter, entries] : full.firstLetters) letters.push_back(letter);
  look(full, letters, state);
  state.counters["entries"] = static_cast<double>(full.stored());
}
BENCHMARK(BM_CacheHitOfOneLetter);

// The letter that most entries begin with.
void BM_CacheHitOfTheCommonestLetter(benchmark::State& state) {
  FullCache full;
  const auto most =
      std::max_element(full.firstLetters.begin(), full.firstLetters.end(),
                       [](const auto& a, const auto& b) { return a.second < b.second; });
  look(full, {most->first}, state);
  state.counters["entries"] = static_cast<double>(most->second);
}
BENCHMARK(BM_CacheHitOfTheCommonestLetter);

// All entries begin with the same letter.
void BM_CacheHitAmongAllEntries(benchmark::State& state) {
  FullCache full;
  full.cache->removeAllObjects();
  for (const auto& query : bench::completions(kEntries)) full.add("a", "a" + query);
  look(full, {"a"}, state);
  state.counters["entries"] = static_cast<double>(full.cache->count());
}
BENCHMARK(BM_CacheHitAmongAllEntries);

}  // namespace
}  // namespace zelkord
