#pragma once

#include <curl/curl.h>

#include <cstddef>
#include <cstdint>
#include <memory>
#include <unordered_map>
#include <vector>

#include "platform/linux/loop/Loop.h"
#include "platform/linux/loop/LoopTimer.h"
#include "platform/linux/url/CurlSettings.h"
#include "platform/linux/url/CurlTransfer.h"
#include "platform/linux/url/CurlURLTask.h"

namespace zelkord {

// Connections of a session: the multi handle with the transfers under way, easy handles to use
// again, and the TLS sessions to resume.
//
// States: unused; open (from the first task; on a metered network the multi handle, and with it the
// connections, goes when it has been idle for a while, and comes back with the next task); retired,
// when it closes as soon as it is idle; closed.
//
// Threading: the loop; made and, once closed, destroyed on any.
// Ownership: holds the tasks under way.
class CurlConnections final {
 public:
  CurlConnections(Loop& loop, CurlSettings settings);
  ~CurlConnections();
  CurlConnections(const CurlConnections&) = delete;
  CurlConnections& operator=(const CurlConnections&) = delete;

  void begin(std::shared_ptr<CurlURLTask> task, CurlURLTask::Order order, TransferPlace place);
  // False when the task is not under way here.
  bool cancel(CurlURLTask& task);
  // How many connections may be kept for later.
  void setMaximumIdle(long count);
  void retire();
  bool isClosed() const;
  // Gives up the tasks under way; the caller drops them.
  std::vector<std::shared_ptr<CurlURLTask>> close();

 private:
  static constexpr SteadyTime kNever = LoopTimer::kNever;

  void _open() ZK_REQUIRES(loop_);
  void _closeMulti() ZK_REQUIRES(loop_);
  std::unique_ptr<CurlTransfer> _takeTransfer() ZK_REQUIRES(loop_);
  void _start(CurlTransfer& transfer) ZK_REQUIRES(loop_);
  void _collectEnded() ZK_REQUIRES(loop_);
  void _ended(CurlTransfer& transfer, CURLcode code) ZK_REQUIRES(loop_);
  bool _follow(CurlTransfer& transfer, URLResult& result) ZK_REQUIRES(loop_);
  void _finish(CurlTransfer& transfer, URLResult result) ZK_REQUIRES(loop_);
  std::shared_ptr<CurlURLTask> _release(CurlTransfer& transfer) ZK_REQUIRES(loop_);
  void _loopEnded() ZK_REQUIRES(loop_);
  void _watch(curl_socket_t socket, std::uint32_t events) ZK_REQUIRES(loop_);
  void _ready(curl_socket_t socket, std::uint32_t events) ZK_REQUIRES(loop_);
  // Sets one of the times below, and with it when `_runDue` is wanted next.
  void _setDue(SteadyTime& which, SteadyTime time) ZK_REQUIRES(loop_);
  void _runDue() ZK_REQUIRES(loop_);
  void _endOverdue(SteadyTime now) ZK_REQUIRES(loop_);

  static int _onSocket(CURL*, curl_socket_t socket, int what, void* self, void*);
  static int _onTimer(CURLM*, long milliseconds, void* self);

  // Fixed after construction.
  Loop& loop_;
  const CurlSettings settings_;

  // The loop's.
  bool open_ ZK_ON(loop_) = false;
  bool retired_ ZK_ON(loop_) = false;
  bool closed_ ZK_ON(loop_) = false;
  long maximumIdle_ ZK_ON(loop_);
  CURLSH* share_ ZK_ON(loop_) = nullptr;
  CURLM* multi_ ZK_ON(loop_) = nullptr;
  std::vector<std::unique_ptr<CurlTransfer>> active_ ZK_ON(loop_);
  std::vector<std::unique_ptr<CurlTransfer>> idle_ ZK_ON(loop_);
  bool fastOpenFails_ ZK_ON(loop_) = false;
  SteadyTime curlDue_ ZK_ON(loop_) = kNever;
  SteadyTime overdueCheck_ ZK_ON(loop_) = kNever;  // no transfer is overdue before
  SteadyTime purgeDue_ ZK_ON(loop_) = kNever;
  LoopTimer timer_;
  std::unordered_map<curl_socket_t, Subscription> watches_ ZK_ON(loop_);
  Subscription loopEnd_ ZK_ON(loop_);
};

}  // namespace zelkord
