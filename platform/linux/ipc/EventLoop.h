#pragma once

#include <sys/epoll.h>

#include <array>
#include <chrono>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <thread>
#include <unordered_map>
#include <vector>

#include "base/FunctionRef.h"
#include "base/Subscription.h"
#include "base/Time.h"
#include "platform/api/WorkQueue.h"
#include "platform/linux/files/Descriptor.h"
#include "platform/linux/queues/LoopInbox.h"

namespace zelkord::ipc {

// One thread around epoll: descriptors, timers (real time) and posted tasks. It sleeps while
// nothing happens; what is posted then runs on the posting thread, when that is a service thread.
//
// Threading: `inbox`, `sync` and `isCurrent` on any thread; everything else on the one that the
// loop belongs to: its own, or one that runs posted tasks.
// Ownership: destroying it (not on its own thread) ends the thread; what was posted and has not
// begun is dropped.
class ZK_CAPABILITY("loop") EventLoop final : private LoopHost {
 public:
  using Ready = std::function<void(std::uint32_t events)>;

  EventLoop();
  ~EventLoop() override;
  EventLoop(const EventLoop&) = delete;
  EventLoop& operator=(const EventLoop&) = delete;

  // Ends the thread; the destructor does it too.
  void stop();

  const std::shared_ptr<LoopInbox>& inbox() const { return inbox_; }
  // Runs the task where the loop's tasks run and waits for it. False when the loop has ended.
  bool sync(FunctionRef<void()> task);
  bool isCurrent() const { return inbox_->isCurrent(); }
  void assertCurrent() const ZK_ASSERTS(this);

  // Calls `ready` with epoll's events. The descriptor stays open until the subscription is gone.
  Subscription watch(int fd, std::uint32_t events, Ready ready);
  // Replaces the events of a watched descriptor.
  void changeEvents(int fd, std::uint32_t events);
  Subscription after(Duration delay, Task task);
  // Runs the task after everything that is ready now has had its turn.
  void soon(Task task);
  // Runs the task when the others have had their turn too: of such tasks, in their order, only as
  // many begin between two looks at what is ready as fit into kSpareTime.
  void inSpareTime(Task task);

 private:
  static constexpr int kEventsAtOnce = 64;
  static constexpr Duration kSpareTime = 1ms;
  using Instant = std::chrono::steady_clock::time_point;
  struct Watched {
    int fd;
    Ready ready;
  };

  // LoopHost
  void runPosted(std::vector<Task> tasks) override;
  bool needsOwnThread() override;

  void _run();
  int _sleep(std::array<epoll_event, kEventsAtOnce>& events);
  int _millisecondsToWait();
  void _dispatch(const epoll_event& event);
  void _runDueTimers();
  void _runSoon();
  void _runInSpareTime();
  static void _runAll(std::vector<Task> tasks);

  const Descriptor epoll_;
  const std::shared_ptr<LoopInbox> inbox_;

  // Loop state.
  bool stopping_ = false;
  std::uint64_t lastId_ = 0;  // 0 is the inbox
  std::unordered_map<std::uint64_t, std::shared_ptr<Watched>> watched_;
  std::unordered_map<int, std::uint64_t> idOfDescriptor_;
  std::multimap<std::pair<Instant, std::uint64_t>, Task> timers_;
  std::vector<Task> soon_;
  std::deque<Task> inSpareTime_;
  Instant sleepsUntil_ = Instant::max();

  std::thread thread_;
};

}  // namespace zelkord::ipc
