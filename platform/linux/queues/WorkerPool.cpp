#include "platform/linux/queues/WorkerPool.h"

#include <algorithm>
#include <system_error>
#include <thread>
#include <utility>

#include "platform/linux/loop/CarriedWork.h"
#include "platform/linux/queues/QueueCore.h"
#include "platform/linux/system/ServiceThread.h"

namespace zelkord {

namespace {

constexpr std::uint64_t kLowTurn = 16;

// The calling thread's place in its pool.
constinit thread_local PoolWorker* tlsPoolWorker = nullptr;

bool isLowQuality(QualityOfService quality) { return quality < QualityOfService::Default; }

}  // namespace

WorkerPool::WorkerPool(unsigned limit, Duration idleLife)
    : limit_(std::max(2u, limit ? limit : std::thread::hardware_concurrency())),
      idleLife_(idleLife) {}

WorkerPool::~WorkerPool() { stop(); }

// A ticket that the leader of a loop has: it counts until he has used it or passed it on.
class WorkerPool::CarriedTicket final : public CarriedWork {
 public:
  CarriedTicket(WorkerPool& pool, Ticket ticket) : pool_(pool), ticket_(std::move(ticket)) {}

  void run() override {
    ticket_->runTicket();
    ticket_.reset();
    pool_._endCarrying();
  }
  void passOn() override {
    pool_._place(std::move(ticket_));
    pool_._endCarrying();
  }

 private:
  WorkerPool& pool_;
  Ticket ticket_;
};

void WorkerPool::submit(Ticket core) {
  const int rank = static_cast<int>(core->quality());
  if (WorkCarrier::takesWork(rank) && _letCarry(core)) {
    WorkCarrier::give(std::make_shared<CarriedTicket>(*this, std::move(core)), rank);
  } else {
    _place(std::move(core));
  }
}

bool WorkerPool::_letCarry(const Ticket& ticket) {
  const auto quality = ticket->quality();
  if (isLowQuality(quality)) return false;
  const MutexLock lock(mutex_);
  if (stopped_) return false;
  for (auto better = static_cast<std::size_t>(quality); better < ready_.size(); ++better) {
    if (!ready_[better].empty()) return false;
  }
  ++carried_;
  return true;
}

void WorkerPool::_endCarrying() {
  const MutexLock lock(mutex_);
  if (--carried_ == 0 && stopped_) gone_.notifyAll();
}

void WorkerPool::_place(Ticket core) {
  Start start;
  bool isStopped = false;
  {
    const MutexLock lock(mutex_);
    isStopped = stopped_;
    if (!isStopped) {
      ready_[static_cast<std::size_t>(core->quality())].push_back(core);
      start = _startOne();
    }
  }
  if (isStopped) return core->dropTicket();
  _perform(start);
}

bool WorkerPool::_mayStart(QualityOfService quality) const {
  return !ready_[static_cast<std::size_t>(quality)].empty() &&
         (!isLowQuality(quality) || runningLow_ + 1 < limit_);
}

// What is to run next.
std::optional<QualityOfService> WorkerPool::_pick() const {
  using enum QualityOfService;
  static constexpr QualityOfService kHighestFirst[] = {High, Default, Utility, Background};
  static constexpr QualityOfService kLowestFirst[] = {Background, Utility, Default, High};
  for (const auto quality : turn_ % kLowTurn == kLowTurn - 1 ? kLowestFirst : kHighestFirst) {
    if (_mayStart(quality)) return quality;
  }
  return std::nullopt;
}

WorkerPool::Start WorkerPool::_startOne() {
  if (counts_.running >= limit_ || !_pick()) return {};
  Start start;
  if (!idle_.empty()) {
    start.idle = idle_.back();
    idle_.pop_back();
  } else if (counts_.total < kMaximumWorkers) {
    start.isNew = true;
    ++counts_.total;
  } else {
    return {};
  }
  ++counts_.running;  // it counts from now on, so that nobody else is started for the same work
  return start;
}

void WorkerPool::_perform(Start start) {
  if (start.idle) start.idle->parker_.unpark();
  if (!start.isNew) return;
  try {
    startServiceThread("zk-worker", ThreadWork::Tasks, [this] { _run(); }).detach();
  } catch (const std::system_error&) {
    const MutexLock lock(mutex_);
    --counts_.total;
    --counts_.running;
    gone_.notifyAll();
  }
}

void WorkerPool::_run() {
  PoolWorker worker(*this);
  tlsPoolWorker = &worker;
  while (const Ticket ticket = _next(worker)) ticket->runTicket();
  tlsPoolWorker = nullptr;
  const MutexLock lock(mutex_);
  --counts_.total;
  gone_.notifyAll();
}

// Waits for something to run. Null when the worker is to leave.
WorkerPool::Ticket WorkerPool::_next(PoolWorker& worker) {
  for (;;) {
    Start start;
    Ticket ticket;
    {
      const MutexLock lock(mutex_);
      _count(worker, -1);
      worker.quality_.reset();
      if (stopped_) return nullptr;
      ticket = _tryTake(worker, start);
      if (!ticket) idle_.push_back(&worker);
    }
    _perform(start);
    if (ticket || !_sleep(worker)) return ticket;
  }
}

WorkerPool::Ticket WorkerPool::_tryTake(PoolWorker& worker, Start& start) {
  const auto quality = counts_.running < limit_ ? _pick() : std::nullopt;
  if (!quality) return nullptr;
  auto& waiting = ready_[static_cast<std::size_t>(*quality)];
  Ticket ticket = std::move(waiting.front());
  waiting.pop_front();
  ++turn_;
  worker.quality_ = quality;
  _count(worker, 1);
  start = _startOne();
  return ticket;
}

// Returns true when woken, which has counted the worker as running; false when it is to leave.
bool WorkerPool::_sleep(PoolWorker& worker) {
  if (worker.parker_.park(idleLife_)) return true;
  if (_mayLeave(worker)) return false;
  return worker.parker_.park();
}

bool WorkerPool::_mayLeave(PoolWorker& worker) {
  const MutexLock lock(mutex_);
  const auto place = std::find(idle_.begin(), idle_.end(), &worker);
  if (place == idle_.end() || counts_.total == 1) return false;
  idle_.erase(place);
  return true;
}

void WorkerPool::_count(const PoolWorker& worker, int change) {
  counts_.running += static_cast<unsigned>(change);
  if (worker.quality_ && isLowQuality(*worker.quality_)) {
    runningLow_ += static_cast<unsigned>(change);
  }
}

PoolWorker* WorkerPool::beginBlocking(bool* isRefused) {
  PoolWorker* const worker = tlsPoolWorker;
  if (!worker) WorkCarrier::passOnAll();
  if (!worker || worker->blocking_) return nullptr;
  WorkerPool& pool = worker->pool_;
  if (pool._tryBlock(*worker, isRefused != nullptr)) return worker;
  *isRefused = true;
  pool._reportRefusedWait();
  return nullptr;
}

void WorkerPool::_reportRefusedWait() {
  std::function<void()> report;
  {
    const MutexLock lock(mutex_);
    report = reportRefusedWait_;
  }
  if (report) report();
}

void WorkerPool::onRefusedWait(std::function<void()> report) {
  const MutexLock lock(mutex_);
  reportRefusedWait_.swap(report);
}

bool WorkerPool::_tryBlock(PoolWorker& worker, bool mayRefuse) {
  Start start;
  {
    const MutexLock lock(mutex_);
    if (mayRefuse && counts_.blocked >= kMaximumWaiting) return false;
    _count(worker, -1);
    ++counts_.blocked;
    start = _startOne();
  }
  worker.blocking_ = true;
  _perform(start);
  return true;
}

void WorkerPool::endBlocking(PoolWorker& worker) {
  worker.blocking_ = false;
  WorkerPool& pool = worker.pool_;
  const MutexLock lock(pool.mutex_);
  --pool.counts_.blocked;
  pool._count(worker, 1);
}

WorkerPool::Counts WorkerPool::counts() const {
  const MutexLock lock(mutex_);
  return counts_;
}

void WorkerPool::stop() {
  std::array<std::deque<Ticket>, 4> dropped;
  {
    const MutexLock lock(mutex_);
    stopped_ = true;
    dropped.swap(ready_);
    for (PoolWorker* worker : idle_) {
      ++counts_.running;
      worker->parker_.unpark();
    }
    idle_.clear();
  }
  // What still runs may wait for their queues.
  for (const auto& tickets : dropped) {
    for (const auto& ticket : tickets) ticket->dropTicket();
  }
  const MutexLock lock(mutex_);
  while (counts_.total > 0 || carried_ > 0) gone_.wait(mutex_);
}

}  // namespace zelkord
