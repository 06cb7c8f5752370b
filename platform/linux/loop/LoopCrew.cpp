#include "platform/linux/loop/LoopCrew.h"

#include <sys/epoll.h>
#include <sys/eventfd.h>

#include <system_error>
#include <utility>

#include "base/Check.h"
#include "platform/linux/system/ServiceThread.h"

namespace zelkord {
namespace {

constexpr const char* kThreadName = "zelkord-loops";  // each of them leads any of the loops
constexpr std::uint64_t kLeaving = 0;                 // no helm's number

}  // namespace

bool LoopHelm::mayLeave() const { return crew_.followers_.load() > 0; }

LoopHelm::Absence LoopHelm::leave() {
  if (!crew_._reserveFollower()) return 0;
  const Absence absence = turn_.load() + 1;
  turn_ = absence;
  _watch(EPOLLIN | EPOLLONESHOT);
  return absence;
}

bool LoopHelm::comeBack(Absence absence) {
  if (!turn_.compare_exchange_strong(absence, absence + 1)) return false;
  _watch(0);
  crew_._releaseFollower();
  return true;
}

bool LoopHelm::_takeOver() {
  Absence absence = turn_.load();
  return absence % 2 == 1 && turn_.compare_exchange_strong(absence, absence + 1);
}

void LoopHelm::end() { ::epoll_ctl(crew_.absences_.get(), EPOLL_CTL_DEL, events_, nullptr); }

void LoopHelm::_watch(std::uint32_t events) const {
  epoll_event event{};
  event.events = events;
  event.data.u64 = number_;
  ::epoll_ctl(crew_.absences_.get(), EPOLL_CTL_MOD, events_, &event);
}

LoopCrew::LoopCrew()
    : absences_(::epoll_create1(EPOLL_CLOEXEC)),
      leaving_(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
  epoll_event event{};
  event.events = EPOLLIN;
  event.data.u64 = kLeaving;
  ZK_CHECK(absences_ && leaving_ &&
               ::epoll_ctl(absences_.get(), EPOLL_CTL_ADD, leaving_.get(), &event) == 0,
           "no epoll for the loops' threads");
}

LoopCrew::~LoopCrew() {
  std::vector<std::thread> threads;
  {
    const MutexLock lock(mutex_);
    threads.swap(threads_);
  }
  for (auto& thread : threads) thread.join();
}

void LoopCrew::begin(const std::shared_ptr<LoopHelm>& helm) {
  const MutexLock lock(mutex_);
  helm->number_ = ++lastNumber_;
  epoll_event event{};
  event.data.u64 = helm->number_;
  ZK_CHECK(::epoll_ctl(absences_.get(), EPOLL_CTL_ADD, helm->events_, &event) == 0,
           "a loop cannot be taken over");
  helms_.emplace(helm->number_, helm);
  try {
    _startThread(helm);
  } catch (const std::system_error&) {
    helms_.erase(helm->number_);
    helm->end();
    throw;
  }
  _startFollower();
}

void LoopCrew::_startThread(std::shared_ptr<LoopHelm> helm) {
  threads_.push_back(
      startServiceThread(kThreadName, ThreadWork::Loop,
                         [this, helm = std::move(helm)]() mutable { _run(std::move(helm)); }));
}

void LoopCrew::_startFollower() {
  try {
    _startThread(nullptr);
  } catch (const std::system_error&) {
    --tooMany_;  // there is one less to leave
  }
}

void LoopCrew::_run(std::shared_ptr<LoopHelm> helm) {
  for (;;) {
    if (!helm) helm = _follow();
    if (!helm) return;
    if (helm->loop_.lead() == LedLoop::Left::Ended) break;
    helm.reset();
  }
  {
    const MutexLock lock(mutex_);
    helms_.erase(helm->number_);
  }
  ++tooMany_;
  ::eventfd_write(leaving_.get(), 1);
}

// Null when this one is too many.
std::shared_ptr<LoopHelm> LoopCrew::_follow() {
  _releaseFollower();
  while (!_leaves()) {
    epoll_event event{};
    if (::epoll_wait(absences_.get(), &event, 1, -1) != 1) continue;
    if (event.data.u64 == kLeaving) {
      eventfd_t count = 0;
      ::eventfd_read(leaving_.get(), &count);
      continue;
    }
    auto helm = _find(event.data.u64);
    if (!helm || !helm->_takeOver()) continue;
    return helm;
  }
  return nullptr;
}

bool LoopCrew::_reserveFollower() {
  int followers = followers_;
  while (followers > 0 && !followers_.compare_exchange_weak(followers, followers - 1)) {
  }
  return followers > 0;
}

void LoopCrew::_releaseFollower() {
  ++followers_;
  if (tooMany_ > 0) ::eventfd_write(leaving_.get(), 1);
}

// Whether the caller, who follows, is too many, and nobody who is away counts on him.
bool LoopCrew::_leaves() {
  do {
    int tooMany = tooMany_;
    while (tooMany > 0 && !tooMany_.compare_exchange_weak(tooMany, tooMany - 1)) {
    }
    if (tooMany <= 0) return false;
    if (_reserveFollower()) {
      if (tooMany_ > 0) ::eventfd_write(leaving_.get(), 1);  // for the next one
      return true;
    }
    ++tooMany_;
  } while (followers_ > 0);  // whoever has come back meanwhile did not see it
  return false;
}

std::shared_ptr<LoopHelm> LoopCrew::_find(std::uint64_t number) {
  const MutexLock lock(mutex_);
  const auto found = helms_.find(number);
  return found == helms_.end() ? nullptr : found->second;
}

}  // namespace zelkord
