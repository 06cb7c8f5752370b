#pragma once

#include <memory>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/Clock.h"
#include "platform/api/FileManager.h"
#include "platform/api/KnowledgeStore.h"
#include "platform/api/Log.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/knowledge/KnowledgeDatabase.h"

namespace zelkord {

// The knowledge store in a SQLite file, by default
// $XDG_DATA_HOME/com.quenta.knowledge/knowledge.db. Donations that come while others are written
// are the next transaction; while there are none, nothing is open.
//
// Threading: any thread; `flush` blocks for the disk.
// Ownership: the files, the queues, the clock and the log outlive it. Its end writes what waits.
// Errors: a failure is logged when it is not like the one before, and its donations are dropped; so
// is what comes while 1,000 wait.
class LinuxKnowledgeStore final : public KnowledgeStore {
 public:
  static constexpr std::size_t kMaximumWaiting = 1000;

  LinuxKnowledgeStore(std::string dataHome, FileManager& files, WorkQueues& queues,
                      const Clock& clock, LogSink& log);
  ~LinuxKnowledgeStore() override;

  void donate(DonatedInteraction interaction) override;
  // Writes now what waits.
  void flush();

 private:
  void _write();
  void _note(const std::string& problem);

  // Fixed after construction.
  const std::string directory_;
  FileManager& files_;
  const Clock& clock_;
  const Logger log_;
  const std::unique_ptr<SerialQueue> queue_;

  // Queue state.
  const KnowledgeDatabase database_ ZK_ON(queue_);
  std::string lastProblem_ ZK_ON(queue_);

  // Own synchronisation.
  Mutex mutex_;
  std::vector<DonatedInteraction> waiting_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
