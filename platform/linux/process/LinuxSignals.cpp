#include "platform/linux/process/LinuxSignals.h"

#include <poll.h>
#include <signal.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdint>
#include <map>
#include <optional>
#include <thread>
#include <utility>
#include <vector>

#include "base/Check.h"
#include "base/Mutex.h"
#include "platform/linux/system/ServiceThread.h"

namespace zelkord {

namespace {

// All that a signal handler can reach. The descriptor is -1 while there is no LinuxSignals.
constinit std::atomic<int> signalWakeUp{-1};
constinit std::atomic<std::uint64_t> signalsSeen{0};
static_assert(std::atomic<std::uint64_t>::is_always_lock_free);

void wakeSignalThread(int descriptor) {
  const std::uint64_t one = 1;
  [[maybe_unused]] const auto written = ::write(descriptor, &one, sizeof one);
}

void noteSignal(int signal) {
  const int error = errno;
  signalsSeen.fetch_or(std::uint64_t{1} << signal);
  const int descriptor = signalWakeUp.load();
  if (descriptor >= 0) wakeSignalThread(descriptor);
  errno = error;
}

}  // namespace

struct LinuxSignals::State {
  struct Registration {
    int signal;
    WorkQueue* queue;
    std::shared_ptr<const Task> task;
  };

  void watch(int signal) ZK_REQUIRES(mutex) {
    struct sigaction action {};
    action.sa_handler = noteSignal;
    action.sa_flags = SA_RESTART;
    ::sigemptyset(&action.sa_mask);
    struct sigaction former {};
    ZK_CHECK(::sigaction(signal, &action, &former) == 0, "a signal that cannot be handled");
    dispositions.emplace(signal, former);
    if (thread.joinable()) return;
    thread = startServiceThread("zk-signals", ThreadWork::Tasks, [this] { run(); });
  }

  void remove(std::uint64_t id) {
    std::map<std::uint64_t, Registration>::node_type released;
    const MutexLock lock(mutex);
    released = registrations.extract(id);
    if (!released) return;
    const int signal = released.mapped().signal;
    for (const auto& [other, registration] : registrations) {
      if (registration.signal == signal) return;
    }
    ::sigaction(signal, &dispositions.at(signal), nullptr);
    dispositions.erase(signal);
  }

  void run() {
    for (;;) {
      waitForWakeUp();
      const MutexLock lock(mutex);
      if (stopped) return;
      const auto signals = signalsSeen.exchange(0);
      if ((signals & leaving) != 0 && !end) end = std::chrono::steady_clock::now() + longestLeaving;
      post(signals);
    }
  }

  // Does not return once the process has to end.
  void waitForWakeUp() {
    pollfd waiting{.fd = wakeUp, .events = POLLIN, .revents = 0};
    for (;;) {
      if (::poll(&waiting, 1, millisecondsToEnd()) > 0) break;
      if (end && std::chrono::steady_clock::now() >= *end) ::_exit(0);
    }
    std::uint64_t count = 0;
    [[maybe_unused]] const auto size = ::read(wakeUp, &count, sizeof count);
  }

  int millisecondsToEnd() const {
    if (!end) return -1;
    const auto left =
        std::chrono::ceil<std::chrono::milliseconds>(*end - std::chrono::steady_clock::now());
    return static_cast<int>(std::max<std::int64_t>(0, left.count()));
  }

  void post(std::uint64_t signals) ZK_REQUIRES(mutex) {
    for (const auto& [id, registration] : registrations) {
      if ((signals >> registration.signal & 1) == 0) continue;
      registration.queue->async([weak = std::weak_ptr(registration.task)] {
        if (const auto task = weak.lock()) (*task)();
      });
    }
  }

  void stop() {
    std::thread running;
    {
      const MutexLock lock(mutex);
      stopped = true;
      running = std::move(thread);
    }
    wakeSignalThread(wakeUp);
    if (running.joinable()) running.join();
  }

  // Fixed before the thread begins.
  const int wakeUp = ::eventfd(0, EFD_CLOEXEC);
  std::uint64_t leaving = 0;  // the signals after which the process ends
  Duration longestLeaving{0};

  // The thread's own.
  std::optional<std::chrono::steady_clock::time_point> end;

  Mutex mutex;
  std::map<std::uint64_t, Registration> registrations ZK_GUARDED_BY(mutex);
  std::map<int, struct sigaction> dispositions ZK_GUARDED_BY(mutex);  // of before
  std::uint64_t lastId ZK_GUARDED_BY(mutex) = 0;
  bool stopped ZK_GUARDED_BY(mutex) = false;
  std::thread thread ZK_GUARDED_BY(mutex);
};

LinuxSignals::LinuxSignals() : state_(std::make_shared<State>()) {
  ZK_CHECK(state_->wakeUp >= 0, "no event descriptor from the kernel");
  int none = -1;
  ZK_CHECK(signalWakeUp.compare_exchange_strong(none, state_->wakeUp),
           "signals are handled already");
  signalsSeen = 0;
}

LinuxSignals::~LinuxSignals() {
  state_->stop();
  signalWakeUp = -1;
  ::close(state_->wakeUp);
}

void LinuxSignals::endProcessAfter(Duration limit, std::initializer_list<int> signals) {
  state_->longestLeaving = limit;
  for (const int signal : signals) state_->leaving |= std::uint64_t{1} << signal;
}

Subscription LinuxSignals::on(int signal, WorkQueue& queue, Task task) {
  ZK_CHECK(signal >= 1 && signal < 64, "a signal out of range");
  const MutexLock lock(state_->mutex);
  const auto id = ++state_->lastId;
  state_->registrations.emplace(
      id, State::Registration{signal, &queue, std::make_shared<const Task>(std::move(task))});
  if (!state_->dispositions.contains(signal)) state_->watch(signal);
  return Subscription([state = state_, id] { state->remove(id); });
}

}  // namespace zelkord
