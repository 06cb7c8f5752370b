#include "platform/linux/loop/CarriedWork.h"

#include <utility>

#include "platform/linux/loop/LoopCrew.h"
#include "platform/linux/system/ServiceThread.h"

namespace zelkord {
namespace {

constinit thread_local WorkCarrier* tlsCarrier = nullptr;

}  // namespace

WorkCarrier::WorkCarrier(std::shared_ptr<LoopHelm> helm) : helm_(std::move(helm)) {
  tlsCarrier = this;
}

WorkCarrier::~WorkCarrier() {
  passOn();
  tlsCarrier = nullptr;
}

bool WorkCarrier::takesWork(int rank) {
  const auto* carrier = tlsCarrier;
  if (!carrier || !carrier->helm_ || carrier->pauses_ > 0) return false;
  if (!carrier->isAway_) return carrier->works_.empty() && carrier->helm_->mayLeave();
  return carrier->works_.size() < kMostNotBegun && carrier->takenWhileAway_ < kMostWhileAway &&
         rank <= carrier->rankOfRunning_;
}

void WorkCarrier::give(std::shared_ptr<CarriedWork> work, int rank) {
  auto& carrier = *tlsCarrier;
  if (carrier.isAway_) ++carrier.takenWhileAway_;
  carrier.works_.push_back({std::move(work), rank});
}

void WorkCarrier::passOnAll() {
  if (tlsCarrier) tlsCarrier->passOn();
}

WorkCarrier::Pause::Pause() : carrier_(tlsCarrier) {
  if (carrier_) ++carrier_->pauses_;
}

WorkCarrier::Pause::~Pause() {
  if (carrier_) --carrier_->pauses_;
}

void WorkCarrier::passOn() {
  for (const auto& piece : std::exchange(works_, {})) piece.work->passOn();
}

void WorkCarrier::close() {
  passOn();
  ++pauses_;
}

bool WorkCarrier::carry() {
  const auto absence = helm_->leave();
  if (absence == 0) {
    passOn();
    return true;
  }
  isAway_ = true;
  takenWhileAway_ = 0;
  const auto before = setThreadWork(ThreadWork::Tasks);
  while (!works_.empty()) {
    const auto piece = std::move(works_.front());
    works_.pop_front();
    rankOfRunning_ = piece.rank;
    piece.work->run();
  }
  setThreadWork(before);
  isAway_ = false;
  return helm_->comeBack(absence);
}

}  // namespace zelkord
