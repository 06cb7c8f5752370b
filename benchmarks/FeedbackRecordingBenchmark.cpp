// What it costs to record feedback from the call of the session manager to the bytes in the
// container, and what a session holds in memory.

#include <benchmark/benchmark.h>
#include <malloc.h>

#include <algorithm>
#include <array>
#include <thread>
#include <vector>

#include "benchmarks/ContainerStore.h"
#include "zelkord/feedback/ClientSessionManager.h"
#include "zelkord/feedback/FeedbackRoom.h"
#include "zelkord/feedback/UserGUIDSource.h"

namespace zelkord {
namespace {

struct OneUser final : UserGUIDSource {
  UUID currentUserGUID() override { return UUID{{1}}; }
  void reset() override {}
};

struct ManagedStore : ContainerStore {
  ManagedStore() {
    assembly.persistentStorage.set(storage);
    manager = std::make_shared<ClientSessionManager>(assembly, std::make_shared<OneUser>(), "bench",
                                                     std::make_shared<FeedbackRoom>(assembly));
  }
  // Returns when all is in the file.
  void finish() {
    manager->waitForPendingFeedback();
    storage->waitForPendingWrites();
  }

  std::shared_ptr<ClientSessionManager> manager;
};

ZelkorFeedback reported(std::int64_t number) {
  auto record = commonFeedback(number);
  record.userAgent = "Lanthe/9";
  return record;
}

// Eight clients as fast as they can. p50_us and p99_us are what one call takes of its caller.
void BM_RecordThroughSessions(benchmark::State& state) {
  constexpr int kThreads = 8;
  constexpr int kRecords = 20'000;
  std::vector<double> calls;
  for (auto _ : state) {
    ManagedStore store;
    std::array<std::vector<double>, kThreads> times;
    std::vector<std::thread> threads;
    const auto start = Steady::now();
    for (auto& own : times) {
      threads.emplace_back([&] {
        own.reserve(kRecords);
        for (int i = 0; i < kRecords; ++i) {
          auto record = reported(i);
          const auto call = Steady::now();
          const bool taken = store.manager->addZelkorFeedback(std::move(record));
          own.push_back(microsecondsSince(call));
          // What waits is bounded: who is faster than the disk lets it catch up.
          if (!taken) store.finish();
        }
      });
    }
    for (auto& thread : threads) thread.join();
    store.finish();
    state.SetIterationTime(microsecondsSince(start) / 1e6);
    for (const auto& own : times) calls.insert(calls.end(), own.begin(), own.end());
  }
  state.SetItemsProcessed(state.iterations() * kThreads * kRecords);
  std::sort(calls.begin(), calls.end());
  state.counters["p50_us"] = calls[calls.size() / 2];
  state.counters["p99_us"] = calls[calls.size() * 99 / 100];
}
BENCHMARK(BM_RecordThroughSessions)->UseManualTime()->Unit(benchmark::kMillisecond);

// What is allocated more after so many records of one open session than before the first.
void BM_MemoryOfAnOpenSession(benchmark::State& state) {
  double held = 0;
  for (auto _ : state) {
    ManagedStore store;
    const auto before = ::mallinfo2().uordblks;
    for (std::int64_t i = 0; i < state.range(0); ++i) {
      store.manager->addZelkorFeedback(reported(i));
      if (i % 1000 == 999) store.finish();
    }
    store.finish();
    held = static_cast<double>(::mallinfo2().uordblks) - static_cast<double>(before);
  }
  state.counters["held_bytes"] = held;
}
BENCHMARK(BM_MemoryOfAnOpenSession)
    ->ArgName("records")
    ->Arg(1'000)
    ->Arg(100'000)
    ->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace zelkord
