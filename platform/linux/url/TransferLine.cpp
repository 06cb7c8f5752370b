#include "platform/linux/url/TransferLine.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "base/Error.h"
#include "platform/linux/url/RequestPolicy.h"
#include "platform/linux/url/URLParts.h"

namespace zelkord {
namespace {

// With its port: another port may be another service.
std::string hostOfRequest(const URLRequest& request) {
  const auto parts = parseURL(request.url);
  return parts ? parts->host + ":" + parts->port : std::string();
}

bool isPatient(const CurlURLTask::Order& order) {
  return order.request->priority == TransferPriority::Low;
}

}  // namespace

TransferLine::TransferLine(std::shared_ptr<Loop> loop, const TransferLimits& limits,
                           LimitReports* reports)
    : loop_(std::move(loop)),
      reports_(reports),
      transfers_("transfers", limits.transfers, reports),
      patientTransfers_("transfers", limits.patientTransfers, reports),
      waiting_("waiting_transfers", limits.waiting, reports),
      timer_(*loop_, [this] {
        loop_->assertCurrent();
        _endOverdue();
      }) {}

void TransferLine::enter(std::shared_ptr<CurlURLTask> task,
                         const std::shared_ptr<CurlPartitions>& partitions) {
  loop_->assertCurrent();
  auto order = task->order();
  if (!order) return task->finish({});
  const auto host = hostOfRequest(*order->request);
  const auto line = hosts_.find(host);
  const bool isFirst = line == hosts_.end() || (!isPatient(*order) && line->second.normal.empty());
  auto place = isFirst ? _takePlace(host, *order) : std::nullopt;
  if (place) return partitions->begin(std::move(task), *std::move(order), *std::move(place));
  const auto deadline = order->resumedAt + timeoutOf(*order->request);
  _wait(host, *order, {std::move(task), partitions, {}, deadline});
}

std::optional<TransferPlace> TransferLine::_takePlace(const std::string& host,
                                                      const CurlURLTask::Order& order) {
  std::optional<Budget::Share> patientPlace = Budget::Share();
  if (isPatient(order)) patientPlace = patientTransfers_.take(host, 1, Budget::Refusal::Silent);
  if (!patientPlace) return std::nullopt;
  auto place = transfers_.take(host, 1, Budget::Refusal::Silent);
  if (!place) return std::nullopt;
  return TransferPlace(*std::move(place), *std::move(patientPlace), [weak = weak_from_this()] {
    if (const auto line = weak.lock()) line->_placeFreed();
  });
}

void TransferLine::_wait(const std::string& host, const CurlURLTask::Order& order,
                         Waiting waiting) {
  auto share = waiting_.take(host);
  if (!share) {
    return waiting.task->finish(
        {.error = urlError(URLErrorCode::CannotConnect, "too many requests wait for the host")});
  }
  if (reports_) reports_->refused(transfers_.name(), host);
  if (!loopEnd_) {
    loopEnd_ = loop_->atEnd([this] {
      loop_->assertCurrent();
      _loopEnded();
    });
  }
  waiting.share = *std::move(share);
  _setDue(std::min(due_, waiting.deadline));
  auto& line = hosts_[host];
  (isPatient(order) ? line.low : line.normal).push_back(std::move(waiting));
}

// In a task of its own: places are given back while libcurl is at work.
void TransferLine::_placeFreed() {
  loop_->assertCurrent();
  if (hosts_.empty() || std::exchange(turnPosted_, true)) return;
  loop_->post([self = shared_from_this()] {
    self->loop_->assertCurrent();
    self->turnPosted_ = false;
    while (self->_beginNext()) {
    }
  });
}

bool TransferLine::_beginNext() {
  if (transfers_.held() >= transfers_.size().inAll) return false;
  auto host = hosts_.upper_bound(lastServed_);
  for (auto left = hosts_.size(); left > 0; --left) {
    if (host == hosts_.end()) host = hosts_.begin();
    auto& [name, line] = *host;
    if (_beginOneOf(name, line.normal) || _beginOneOf(name, line.low)) {
      lastServed_ = name;
      if (line.isEmpty()) hosts_.erase(host);
      return true;
    }
    ++host;
  }
  return false;
}

bool TransferLine::_beginOneOf(const std::string& host, Queue& queue) {
  if (queue.empty()) return false;
  auto order = queue.front().task->order();
  auto place = order ? _takePlace(host, *order) : std::nullopt;
  if (order && !place) return false;
  const auto next = std::move(queue.front());
  queue.pop_front();
  if (order) {
    next.partitions->begin(next.task, *std::move(order), *std::move(place));
  } else {
    next.task->finish({});
  }
  return true;
}

template <typename Predicate>
std::vector<std::shared_ptr<CurlURLTask>> TransferLine::_takeOut(Predicate isOut) {
  std::vector<std::shared_ptr<CurlURLTask>> out;
  for (auto host = hosts_.begin(); host != hosts_.end();) {
    for (Queue* queue : {&host->second.normal, &host->second.low}) {
      std::erase_if(*queue, [&](const Waiting& waiting) {
        if (!isOut(waiting)) return false;
        out.push_back(waiting.task);
        return true;
      });
    }
    host = host->second.isEmpty() ? hosts_.erase(host) : std::next(host);
  }
  return out;
}

bool TransferLine::cancel(const CurlURLTask& task) {
  loop_->assertCurrent();
  if (hosts_.empty()) return false;
  const auto found =
      _takeOut([&task](const Waiting& waiting) { return waiting.task.get() == &task; });
  for (const auto& cancelled : found) cancelled->finish({});
  return !found.empty();
}

std::vector<std::shared_ptr<CurlURLTask>> TransferLine::leave(const CurlPartitions& partitions) {
  loop_->assertCurrent();
  return _takeOut([&](const Waiting& waiting) { return waiting.partitions.get() == &partitions; });
}

void TransferLine::_setDue(SteadyTime time) {
  due_ = time;
  timer_.set(due_);
}

void TransferLine::_endOverdue() {
  const auto now = steadyNow();
  auto next = LoopTimer::kNever;
  const auto overdue = _takeOut([&next, now](const Waiting& waiting) {
    if (waiting.deadline > now) next = std::min(next, waiting.deadline);
    return waiting.deadline <= now;
  });
  _setDue(next);
  for (const auto& task : overdue) {
    task->finish({.error = urlError(URLErrorCode::TimedOut, "timed out in line for the host")});
  }
}

void TransferLine::_loopEnded() {
  _setDue(LoopTimer::kNever);
  for (const auto& task : _takeOut([](const Waiting&) { return true; })) {
    task->finish({.error = urlError(URLErrorCode::Cancelled, "loading has ended")});
  }
}

}  // namespace zelkord
