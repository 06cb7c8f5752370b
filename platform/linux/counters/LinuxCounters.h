#pragma once

#include <map>
#include <memory>
#include <string>

#include "base/Mutex.h"
#include "platform/api/BoundedCounters.h"
#include "platform/api/Counters.h"
#include "platform/api/FileManager.h"
#include "platform/api/Log.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/counters/CounterDatabase.h"

namespace zelkord {

// Counters in memory, bounded, kept over restarts in "counters.db" of the state directory and shown
// as OpenMetrics text in "metrics.prom" of the runtime directory.
//
// States: clean; changed, from the first change after a write: 15 s later both files are written.
//
// Threading: any thread; `save` blocks for the disk.
// Ownership: the files, the queues and the log outlive it. Its end saves.
// Errors: a write that failed is logged when it does not fail like the one before, and tried again
// 15 s later.
class LinuxCounters final : public Counters {
 public:
  LinuxCounters(FileManager& files, WorkQueues& queues, LogSink& log);
  ~LinuxCounters() override;

  void add(std::string_view key, std::int64_t amount) override;
  void set(std::string_view key, std::int64_t value) override;
  std::map<std::string, std::int64_t> all() const override;

  // Writes both files now when anything changed.
  void save();

 private:
  void _markChanged() ZK_REQUIRES(mutex_);
  void _write();
  bool _writeFiles(const std::map<std::string, std::int64_t>& values);
  void _note(const std::string& problem);

  // Fixed after construction.
  FileManager& files_;
  const Logger log_;
  const std::unique_ptr<SerialQueue> queue_;

  // Queue state.
  CounterDatabase database_ ZK_ON(queue_);
  std::string lastProblem_ ZK_ON(queue_);

  // Own synchronisation.
  mutable Mutex mutex_;
  BoundedCounters values_ ZK_GUARDED_BY(mutex_);
  bool changed_ ZK_GUARDED_BY(mutex_) = false;
  Subscription timer_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
