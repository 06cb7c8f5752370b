#pragma once

#include <deque>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/api/Budget.h"
#include "platform/linux/loop/Loop.h"
#include "platform/linux/loop/LoopTimer.h"
#include "platform/linux/url/CurlPartitions.h"
#include "platform/linux/url/CurlURLTask.h"
#include "platform/linux/url/TransferLimits.h"

namespace zelkord {

// Where the tasks of all sessions wait when too many transfers are under way, in all or to their
// host. Among those to a host it is first come, first served, those of low priority after the
// others; hosts take turns. Tasks of low priority leave a quarter of the places to the others.
//
// Threading: the loop; made and destroyed on any. Ownership: holds the tasks that wait; the
// reports outlive it.
// Errors: waiting is counted and named by the reports, and is time without progress (-1001); what
// the line has no room for ends at once (-1004).
class TransferLine final : public std::enable_shared_from_this<TransferLine> {
 public:
  // Without reports nothing is counted.
  TransferLine(std::shared_ptr<Loop> loop, const TransferLimits& limits, LimitReports* reports);

  // Begins the task with those partitions, at once or when it is its turn.
  void enter(std::shared_ptr<CurlURLTask> task, const std::shared_ptr<CurlPartitions>& partitions);
  // Ends a task that waits; false when it does not.
  bool cancel(const CurlURLTask& task);
  // Gives up what waits to begin with those partitions; the caller drops them.
  std::vector<std::shared_ptr<CurlURLTask>> leave(const CurlPartitions& partitions);

 private:
  struct Waiting {
    std::shared_ptr<CurlURLTask> task;
    std::shared_ptr<CurlPartitions> partitions;
    Budget::Share share;
    SteadyTime deadline;
  };
  using Queue = std::deque<Waiting>;
  struct Host {
    Queue normal;
    Queue low;

    bool isEmpty() const { return normal.empty() && low.empty(); }
  };

  std::optional<TransferPlace> _takePlace(const std::string& host, const CurlURLTask::Order& order)
      ZK_REQUIRES(*loop_);
  void _wait(const std::string& host, const CurlURLTask::Order& order, Waiting waiting)
      ZK_REQUIRES(*loop_);
  void _placeFreed();
  bool _beginNext() ZK_REQUIRES(*loop_);
  bool _beginOneOf(const std::string& host, Queue& queue) ZK_REQUIRES(*loop_);
  void _endOverdue() ZK_REQUIRES(*loop_);
  void _loopEnded() ZK_REQUIRES(*loop_);
  void _setDue(SteadyTime time) ZK_REQUIRES(*loop_);
  // Takes out those that `isOut` names.
  template <typename Predicate>
  std::vector<std::shared_ptr<CurlURLTask>> _takeOut(Predicate isOut) ZK_REQUIRES(*loop_);

  // Fixed after construction.
  const std::shared_ptr<Loop> loop_;
  LimitReports* const reports_;
  Budget transfers_;
  Budget patientTransfers_;
  Budget waiting_;

  // The loop's.
  bool turnPosted_ ZK_ON(*loop_) = false;
  std::map<std::string, Host> hosts_ ZK_ON(*loop_);  // those for which somebody waits
  std::string lastServed_ ZK_ON(*loop_);
  SteadyTime due_ ZK_ON(*loop_) = LoopTimer::kNever;  // nobody's time is up before
  LoopTimer timer_;
  Subscription loopEnd_ ZK_ON(*loop_);
};

}  // namespace zelkord
