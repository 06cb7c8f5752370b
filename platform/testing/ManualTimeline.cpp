#include "platform/testing/ManualTimeline.h"

#include <algorithm>

#include "platform/testing/ManualQueue.h"
#include "platform/testing/ManualWaiting.h"

namespace zelkord {

namespace {
constexpr WallTime kTimelineStart{std::chrono::seconds{1'795'348'800}};  // 2026-11-22 12:00:00 UTC
constexpr const char* kGlobalLabels[] = {"global.background", "global.utility", "global.default",
                                         "global.high"};
}  // namespace

ManualTimeline::ManualTimeline()
    : core_(std::make_shared<TimelineCore>()),
      main_(std::make_unique<ManualSerialQueue>(core_, "main")),
      wallOffset_(kTimelineStart.time_since_epoch() - core_->now().time_since_epoch()) {
  for (std::size_t i = 0; i < globals_.size(); ++i) {
    globals_[i] = std::make_unique<ManualGlobalQueue>(core_, kGlobalLabels[i], true);
  }
}

ManualTimeline::~ManualTimeline() { core_->drop(nullptr); }

void ManualTimeline::runUntilIdle() {
  // A wait moves the time, so that more may be due after it.
  for (SteadyTime limit = now();; limit = now()) {
    core_->runDue(limit);
    if (limit == now()) return;
  }
}

void ManualTimeline::advance(Duration duration) {
  const SteadyTime target = deadlineAfter(now(), duration);
  core_->runDue(target);
  core_->moveTo(target);
}

bool ManualTimeline::runUntil(FunctionRef<bool()> done, Duration limit) {
  return core_->pump(done, deadlineAfter(now(), limit));
}

std::optional<Duration> ManualTimeline::nextDelay() const {
  const auto* next = core_->next();
  if (!next) return std::nullopt;
  return std::max(Duration::zero(), next->first - now());
}

std::size_t ManualTimeline::pendingCount() const { return core_->count(); }

void ManualTimeline::letMainRunAtOnce() {
  static_cast<ManualSerialQueue&>(*main_).queue()->runsAtOnce = true;
}

void ManualTimeline::setWall(WallTime time) {
  wallOffset_ = time.time_since_epoch() - now().time_since_epoch();
}

SteadyTime ManualTimeline::now() const { return core_->now(); }

WallTime ManualTimeline::wallNow() const {
  return WallTime(now().time_since_epoch() + wallOffset_);
}

std::unique_ptr<SerialQueue> ManualTimeline::makeSerialQueue(std::string label, QualityOfService) {
  return std::make_unique<ManualSerialQueue>(core_, std::move(label));
}

std::unique_ptr<ConcurrentQueue> ManualTimeline::makeConcurrentQueue(std::string label) {
  return std::make_unique<ManualConcurrentQueue>(core_, std::move(label));
}

WorkQueue& ManualTimeline::global(QualityOfService quality) {
  return *globals_.at(static_cast<std::size_t>(quality));
}

std::unique_ptr<Semaphore> ManualTimeline::makeSemaphore(unsigned permits) {
  return std::make_unique<ManualSemaphore>(core_, permits);
}

std::unique_ptr<Group> ManualTimeline::makeGroup() { return std::make_unique<ManualGroup>(core_); }

std::unique_ptr<Timer> ManualTimeline::makeTimer(WorkQueue& queue, Task task) {
  return std::make_unique<ManualTimer>(queue, std::move(task));
}

}  // namespace zelkord
