// What it costs to keep feedback in containers: from the call to the bytes in the file, against a
// loop of `writev` of the same bytes; what callers are held up; reading a full container; the look
// into a directory of many.

#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <sys/uio.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <deque>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "benchmarks/ContainerStore.h"
#include "corezelkor/proto/Feedback.pb.h"
#include "platform/linux/system/Descriptor.h"
#include "platform/testing/TemporaryDirectory.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/storage/SessionUnarchiver.h"
#include "zelkord/storage/StorageTestSupport.h"

namespace zelkord {
namespace {

double median(std::vector<double>& values) {
  const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
  std::nth_element(values.begin(), middle, values.end());
  return *middle;
}

// The floor: each record, laid out in advance, with one `writev` of its length and its bytes.
void BM_WritevLoop(benchmark::State& state) {
  const TemporaryDirectory root;
  const Descriptor file(
      ::open((root / "file").c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600));
  auto message = storedMessage(commonFeedback(1));
  std::uint64_t length = message.size();
  iovec pieces[] = {{&length, sizeof length}, {message.data(), message.size()}};
  std::vector<double> times;
  for (auto _ : state) {
    const auto start = Steady::now();
    for (std::int64_t i = 0; i < state.range(0); ++i) {
      if (::writev(file.get(), pieces, 2) < 0) state.SkipWithError("cannot write");
    }
    times.push_back(microsecondsSince(start));
  }
  state.counters["p50_us"] = median(times);
}
BENCHMARK(BM_WritevLoop)->Arg(1)->Arg(16)->Arg(64)->Arg(512);

// The records laid out and handed over one by one, until the last one's attempt is told of.
void BM_RecordToFile(benchmark::State& state) {
  ContainerStore store;
  const auto container = store.container();
  store.storage->waitForPendingWrites();
  const auto feedback = commonFeedback(1);
  std::vector<double> times;
  std::atomic<bool> written = false;
  for (auto _ : state) {
    written = false;
    const auto start = Steady::now();
    for (std::int64_t i = 1; i < state.range(0); ++i) container->writeFeedback(feedback, nullptr);
    container->writeFeedback(feedback, [&] { written = true; });
    while (!written) std::this_thread::yield();
    times.push_back(microsecondsSince(start));
  }
  state.counters["p50_us"] = median(times);
}
BENCHMARK(BM_RecordToFile)->Arg(1)->Arg(16)->Arg(64)->Arg(512);

// Eight threads as fast as they can, a container each or all one; from the first call to the last
// byte. p50_us and p99_us are what one call takes of its caller.
void BM_RecordFromEightThreads(benchmark::State& state) {
  constexpr int kThreads = 8;
  constexpr int kRecords = 20'000;
  std::vector<double> calls;
  for (auto _ : state) {
    ContainerStore store;
    std::array<std::vector<double>, kThreads> times;
    std::vector<std::thread> threads;
    const auto shared = store.container();
    const auto start = Steady::now();
    for (auto& own : times) {
      threads.emplace_back([&] {
        const auto container = state.range(0) == 1 ? shared : store.container();
        own.reserve(kRecords);
        for (int i = 0; i < kRecords; ++i) {
          const auto feedback = commonFeedback(i);
          const auto call = Steady::now();
          container->writeFeedback(feedback, nullptr);
          own.push_back(microsecondsSince(call));
        }
      });
    }
    for (auto& thread : threads) thread.join();
    store.storage->waitForPendingWrites();
    state.SetIterationTime(microsecondsSince(start) / 1e6);
    for (const auto& own : times) calls.insert(calls.end(), own.begin(), own.end());
  }
  state.SetItemsProcessed(state.iterations() * kThreads * kRecords);
  std::sort(calls.begin(), calls.end());
  state.counters["p50_us"] = calls[calls.size() / 2];
  state.counters["p99_us"] = calls[calls.size() * 99 / 100];
}
BENCHMARK(BM_RecordFromEightThreads)
    ->ArgName("containers")
    ->Arg(1)
    ->Arg(8)
    ->UseManualTime()
    ->Unit(benchmark::kMillisecond);

constexpr std::size_t kFull = std::size_t{2} << 20;

// The floor: the messages of a full container, in memory, and the feedback in each, parsed by the
// generated code. Kept are all of them, as by the reader, or (0) only the last one.
void BM_ParseMessages(benchmark::State& state) {
  const auto message = storedMessage(commonFeedback(1));
  const std::vector<std::string> messages(kFull / (kLengthSize + message.size()), message);
  for (auto _ : state) {
    std::deque<corezelkor::CZZelkorFeedback> records(1);
    std::deque<corezelkor::CZCustomFeedback> feedbacks(1);
    for (const auto& bytes : messages) {
      if (!records.back().ParseFromString(bytes) ||
          !feedbacks.back().ParseFromString(records.back().payload().feedback())) {
        state.SkipWithError("cannot parse");
      }
      if (state.range(0) == 0) continue;
      records.emplace_back();
      feedbacks.emplace_back();
    }
    benchmark::DoNotOptimize(feedbacks);
  }
  state.counters["records"] = static_cast<double>(messages.size());
}
BENCHMARK(BM_ParseMessages)->ArgName("kept")->Arg(1)->Arg(0)->Unit(benchmark::kMicrosecond);

// A container of two mebibytes, as an uploader reads it.
void BM_ReadFullContainer(benchmark::State& state) {
  ContainerStore store(kFull);
  const auto one = framed(storedMessage(commonFeedback(1)));
  auto bytes = containerBytes(*zelkordUserAgent(store.fakes.device), 0);
  while (bytes.size() + one.size() < kFull) bytes += one;
  store.root.write("session.0", bytes);
  store.storage->start();
  const auto handles = store.storage->getAvailableSessionHandles();
  std::size_t records = 0;
  for (auto _ : state) {
    const auto session = handles.at(0)->read();
    if (!session) state.SkipWithError("cannot read");
    records = session ? session->feedbacks.size() : 0;
  }
  state.counters["records"] = static_cast<double>(records);
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(bytes.size()));
}
BENCHMARK(BM_ReadFullContainer)->Unit(benchmark::kMicrosecond);

// From the start until the containers can be had; `start_us` is what the start itself waits.
void BM_ScanContainers(benchmark::State& state) {
  ContainerStore store;
  const auto bytes = containerBytes(*zelkordUserAgent(store.fakes.device), 50);
  for (std::int64_t i = 0; i < state.range(0); ++i) {
    store.root.write("session." + std::to_string(i), bytes);
  }
  std::vector<double> starts;
  for (auto _ : state) {
    const auto storage = std::make_shared<ZelkorPersistentStorage>(store.assembly);
    const auto begin = Steady::now();
    storage->start();
    starts.push_back(microsecondsSince(begin));
    const auto found = static_cast<std::int64_t>(storage->getAvailableSessionHandles().size());
    if (found != state.range(0)) state.SkipWithError("containers are missing");
  }
  state.counters["start_us"] = median(starts);
}
BENCHMARK(BM_ScanContainers)->Arg(1'000)->Arg(10'000)->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace zelkord
