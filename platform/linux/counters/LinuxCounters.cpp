#include "platform/linux/counters/LinuxCounters.h"

#include "platform/linux/counters/OpenMetrics.h"

namespace zelkord {
namespace {

constexpr Duration kCounterWriteDelay = 15s;

std::int64_t saturatedSum(std::int64_t a, std::int64_t b) {
  std::int64_t sum = 0;
  if (!__builtin_add_overflow(a, b, &sum)) return sum;
  return b > 0 ? INT64_MAX : INT64_MIN;
}

}  // namespace

LinuxCounters::LinuxCounters(FileManager& files, WorkQueues& queues, LogSink& log)
    : files_(files),
      log_(log, ""),
      queue_(queues.makeSerialQueue("com.quenta.zelkord.counters")),
      database_(files.directories().state + "/counters.db", log_) {
  CounterDatabase::Values loaded;
  queue_->sync([&] {
    queue_->assertCurrent();
    loaded = database_.load();
  });
  const MutexLock lock(mutex_);
  values_.insert(loaded.begin(), loaded.end());
}

LinuxCounters::~LinuxCounters() { save(); }

void LinuxCounters::add(std::string_view key, std::int64_t amount) {
  const MutexLock lock(mutex_);
  auto found = values_.find(key);
  if (found == values_.end()) found = values_.emplace(key, 0).first;
  found->second = saturatedSum(found->second, amount);
  markChanged();
}

void LinuxCounters::set(std::string_view key, std::int64_t value) {
  const MutexLock lock(mutex_);
  values_.insert_or_assign(std::string(key), value);
  markChanged();
}

std::map<std::string, std::int64_t> LinuxCounters::all() const {
  const MutexLock lock(mutex_);
  return {values_.begin(), values_.end()};
}

void LinuxCounters::markChanged() {
  if (std::exchange(changed_, true)) return;
  timer_ = queue_->after(kCounterWriteDelay, [this] { write(); });
}

void LinuxCounters::save() {
  queue_->sync([this] { write(); });
}

void LinuxCounters::write() {
  queue_->assertCurrent();
  {
    const MutexLock lock(mutex_);
    timer_.reset();
    if (!std::exchange(changed_, false)) return;
  }
  if (writeFiles(all())) return;
  const MutexLock lock(mutex_);
  markChanged();
}

bool LinuxCounters::writeFiles(const std::map<std::string, std::int64_t>& values) {
  queue_->assertCurrent();
  const auto failure = database_.store(values);
  auto error = files_.createDirectory(files_.directories().runtime);
  if (!error) {
    error = files_.writeAtomically(files_.directories().runtime + "/metrics.prom",
                                   openMetricsText(values), 0600);
  }
  note(failure ? failure->text : error ? error->description() : std::string());
  return !failure && !error;
}

void LinuxCounters::note(const std::string& problem) {
  queue_->assertCurrent();
  if (!problem.empty() && problem != lastProblem_)
    log_.error("counters are not saved: {}", problem);
  lastProblem_ = problem;
}

}  // namespace zelkord
