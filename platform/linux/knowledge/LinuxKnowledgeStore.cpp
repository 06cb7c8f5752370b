#include "platform/linux/knowledge/LinuxKnowledgeStore.h"

#include <utility>

namespace zelkord {

LinuxKnowledgeStore::LinuxKnowledgeStore(std::string dataHome, FileManager& files,
                                         WorkQueues& queues, const Clock& clock, LogSink& log)
    : directory_(std::move(dataHome) + "/com.quenta.knowledge"),
      files_(files),
      clock_(clock),
      log_(log, ""),
      queue_(queues.makeSerialQueue("com.quenta.zelkord.knowledge")),
      database_(directory_ + "/knowledge.db") {}

LinuxKnowledgeStore::~LinuxKnowledgeStore() { flush(); }

void LinuxKnowledgeStore::donate(DonatedInteraction interaction) {
  {
    const MutexLock lock(mutex_);
    if (waiting_.size() >= kMaximumWaiting) return;
    waiting_.push_back(std::move(interaction));
    if (waiting_.size() > 1) return;  // a write is on its way
  }
  queue_->async([this] { _write(); });
}

void LinuxKnowledgeStore::flush() {
  queue_->sync([this] { _write(); });
}

void LinuxKnowledgeStore::_write() {
  queue_->assertCurrent();
  std::vector<DonatedInteraction> batch;
  {
    const MutexLock lock(mutex_);
    batch.swap(waiting_);
  }
  if (batch.empty()) return;
  if (const auto error = files_.createDirectory(directory_)) return _note(error->description());
  const auto failure = database_.add(batch, clock_.wallNow());
  _note(failure ? failure->text : std::string());
}

void LinuxKnowledgeStore::_note(const std::string& problem) {
  queue_->assertCurrent();
  if (!problem.empty() && problem != lastProblem_) {
    log_.error("interactions are not kept in {}: {}", database_.path(), problem);
  }
  lastProblem_ = problem;
}

}  // namespace zelkord
