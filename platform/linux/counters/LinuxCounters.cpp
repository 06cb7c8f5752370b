#include "platform/linux/counters/LinuxCounters.h"

#include "platform/linux/counters/OpenMetrics.h"

namespace zelkord {
namespace {

constexpr Duration kCounterWriteDelay = 15s;

}  // namespace

LinuxCounters::LinuxCounters(FileManager& files, WorkQueues& queues, LogSink& log)
    : files_(files),
      log_(log, ""),
      queue_(queues.makeSerialQueue("com.quenta.zelkord.counters")),
      database_(files.directories().state + "/counters.db", log_) {
  BoundedCounters loaded;
  queue_->sync([&] {
    queue_->assertCurrent();
    loaded = database_.load();
  });
  const MutexLock lock(mutex_);
  values_ = std::move(loaded);
}

LinuxCounters::~LinuxCounters() { save(); }

void LinuxCounters::add(std::string_view key, std::int64_t amount) {
  const MutexLock lock(mutex_);
  values_.add(key, amount);
  _markChanged();
}

void LinuxCounters::set(std::string_view key, std::int64_t value) {
  const MutexLock lock(mutex_);
  values_.set(key, value);
  _markChanged();
}

std::map<std::string, std::int64_t> LinuxCounters::all() const {
  const MutexLock lock(mutex_);
  return {values_.values().begin(), values_.values().end()};
}

void LinuxCounters::_markChanged() {
  if (std::exchange(changed_, true)) return;
  timer_ = queue_->after(kCounterWriteDelay, [this] { _write(); });
}

void LinuxCounters::save() {
  queue_->sync([this] { _write(); });
}

void LinuxCounters::_write() {
  queue_->assertCurrent();
  {
    const MutexLock lock(mutex_);
    timer_.reset();
    if (!std::exchange(changed_, false)) return;
  }
  if (_writeFiles(all())) return;
  const MutexLock lock(mutex_);
  _markChanged();
}

bool LinuxCounters::_writeFiles(const std::map<std::string, std::int64_t>& values) {
  queue_->assertCurrent();
  const auto failure = database_.store(values);
  auto error = files_.createDirectory(files_.directories().runtime);
  if (!error) {
    error = files_.writeAtomically(files_.directories().runtime + "/metrics.prom",
                                   openMetricsText(values), 0600);
  }
  _note(failure ? failure->text : error ? error->description() : std::string());
  return !failure && !error;
}

void LinuxCounters::_note(const std::string& problem) {
  queue_->assertCurrent();
  if (!problem.empty() && problem != lastProblem_)
    log_.error("counters are not saved: {}", problem);
  lastProblem_ = problem;
}

}  // namespace zelkord
