#include <benchmark/benchmark.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <memory>
#include <mutex>
#include <thread>
#include <vector>

#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/queues/Parker.h"

// What queues cost. The floor of `sync` is a lock and an unlock of a free mutex; the floor of a
// hand-over is one thread that wakes another through a futex.

namespace zelkord {
namespace {

struct QueueSetup {
  LinuxClock clock;
  LinuxWorkQueues queues{clock};
};

void LockFloor(benchmark::State& state) {
  std::mutex mutex;
  for (auto _ : state) {
    const std::lock_guard lock(mutex);
    benchmark::ClobberMemory();
  }
}
BENCHMARK(LockFloor);

void SyncOnIdleSerialQueue(benchmark::State& state) {
  QueueSetup setup;
  const auto queue = setup.queues.makeSerialQueue("serial");
  for (auto _ : state) queue->sync([] { benchmark::ClobberMemory(); });
}
BENCHMARK(SyncOnIdleSerialQueue);

void SharedSync(benchmark::State& state) {
  static QueueSetup* setup;
  static ConcurrentQueue* queue;
  if (state.thread_index() == 0) {
    setup = new QueueSetup;
    queue = setup->queues.makeConcurrentQueue("concurrent").release();
  }
  for (auto _ : state) queue->sync([] { benchmark::ClobberMemory(); });
  if (state.thread_index() == 0) {
    delete queue;
    delete setup;
  }
}
BENCHMARK(SharedSync)->Threads(1)->Threads(2);

void TimerRearm(benchmark::State& state) {
  QueueSetup setup;
  const auto queue = setup.queues.makeSerialQueue("serial");
  const auto timer = setup.queues.makeTimer(*queue, [] {});
  for (auto _ : state) timer->arm(30s, 1s);
}
BENCHMARK(TimerRearm);

void DelayedTaskMadeAndCancelled(benchmark::State& state) {
  QueueSetup setup;
  const auto queue = setup.queues.makeSerialQueue("serial");
  for (auto _ : state) queue->after(30s, [] {}).reset();
}
BENCHMARK(DelayedTaskMadeAndCancelled);

// Times of single hand-overs, of which the median and the 99th percentile are reported, in
// microseconds.
class HandOverTimes {
 public:
  using Clock = std::chrono::steady_clock;

  void begin() { start_ = Clock::now(); }
  void end() {
    taken_.push_back(std::chrono::duration<double, std::micro>(Clock::now() - start_).count());
  }
  void report(benchmark::State& state) {
    std::sort(taken_.begin(), taken_.end());
    state.counters["p50_us"] = taken_[taken_.size() / 2];
    state.counters["p99_us"] = taken_[taken_.size() * 99 / 100];
  }

 private:
  Clock::time_point start_;
  std::vector<double> taken_;
};

// One way only: the time is taken where the task runs. Before each one everything has fallen idle.
void HandOverFloor(benchmark::State& state) {
  Parker there, back;
  HandOverTimes times;
  std::atomic<bool> last = false;
  std::thread worker([&] {
    for (there.park(); !last; there.park()) {
      times.end();
      back.unpark();
    }
  });
  for (auto _ : state) {
    times.begin();
    there.unpark();
    back.park();
  }
  last = true;
  there.unpark();
  worker.join();
  times.report(state);
}
BENCHMARK(HandOverFloor)->UseRealTime();

void AsyncToIdleSerialQueue(benchmark::State& state) {
  QueueSetup setup;
  const auto queue = setup.queues.makeSerialQueue("serial");
  Parker back;
  HandOverTimes times;
  for (auto _ : state) {
    times.begin();
    queue->async([&] {
      times.end();
      back.unpark();
    });
    back.park();
  }
  queue->sync([] {});
  times.report(state);
}
BENCHMARK(AsyncToIdleSerialQueue)->UseRealTime();

// A queue that is kept busy: what a task costs without any wake-up.
void AsyncThroughput(benchmark::State& state) {
  QueueSetup setup;
  const auto queue = setup.queues.makeSerialQueue("serial");
  constexpr int kTasks = 1000;
  for (auto _ : state) {
    for (int i = 0; i < kTasks; ++i) queue->async([] { benchmark::ClobberMemory(); });
    queue->sync([] {});
  }
  state.SetItemsProcessed(state.iterations() * kTasks);
}
BENCHMARK(AsyncThroughput)->UseRealTime();

}  // namespace
}  // namespace zelkord
