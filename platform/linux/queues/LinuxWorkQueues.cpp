#include "platform/linux/queues/LinuxWorkQueues.h"

#include <utility>

#include "base/Check.h"
#include "platform/linux/queues/LinuxQueue.h"
#include "platform/linux/queues/LinuxTimer.h"
#include "platform/linux/queues/LinuxWaiting.h"
#include "platform/linux/queues/MainLoop.h"

namespace zelkord {

namespace {

constexpr const char* kGlobalQueueLabels[] = {"global.background", "global.utility",
                                              "global.default", "global.high"};

std::shared_ptr<QueueCore> makeCore(std::shared_ptr<Executor> executor, std::string label,
                                    QualityOfService quality = QualityOfService::Default) {
  return std::make_shared<QueueCore>(std::move(executor), std::move(label), quality);
}

}  // namespace

LinuxWorkQueues::LinuxWorkQueues(const LinuxClock& clock, unsigned workers)
    : rate_(clock.rate()),
      pool_(std::make_shared<WorkerPool>(workers)),
      mainLoop_(std::make_shared<MainLoop>()),
      timers_(std::make_shared<TimerService>()),
      main_(std::make_unique<LinuxSerialQueue>(makeCore(mainLoop_, "main"), timers_, rate_)) {
  for (std::size_t i = 0; i < globals_.size(); ++i) {
    auto core = makeCore(pool_, kGlobalQueueLabels[i], static_cast<QualityOfService>(i));
    globals_[i] = std::make_unique<LinuxGlobalQueue>(std::move(core), timers_, rate_);
  }
}

LinuxWorkQueues::~LinuxWorkQueues() {
  timers_->stop();
  pool_->stop();
}

std::unique_ptr<SerialQueue> LinuxWorkQueues::makeSerialQueue(std::string label,
                                                              QualityOfService quality) {
  return std::make_unique<LinuxSerialQueue>(makeCore(pool_, std::move(label), quality), timers_,
                                            rate_);
}

std::unique_ptr<ConcurrentQueue> LinuxWorkQueues::makeConcurrentQueue(std::string label) {
  return std::make_unique<LinuxConcurrentQueue>(makeCore(pool_, std::move(label)), timers_, rate_);
}

WorkQueue& LinuxWorkQueues::global(QualityOfService quality) {
  return *globals_.at(static_cast<std::size_t>(quality));
}

SerialQueue& LinuxWorkQueues::main() { return *main_; }

std::unique_ptr<Semaphore> LinuxWorkQueues::makeSemaphore(unsigned permits) {
  return std::make_unique<LinuxSemaphore>(permits);
}

std::unique_ptr<Group> LinuxWorkQueues::makeGroup() { return std::make_unique<LinuxGroup>(); }

std::unique_ptr<Timer> LinuxWorkQueues::makeTimer(WorkQueue& queue, Task task) {
  const auto* target = dynamic_cast<const AlarmTarget*>(&queue);
  ZK_CHECK(target, "a timer on a queue of another factory");
  return std::make_unique<LinuxTimer>(
      timers_, target->makeAlarm(std::move(task), Alarm::Kind::Again), rate_);
}

void LinuxWorkQueues::runMainLoop() { mainLoop_->run(); }

void LinuxWorkQueues::stopMainLoop() { mainLoop_->stop(); }

}  // namespace zelkord
