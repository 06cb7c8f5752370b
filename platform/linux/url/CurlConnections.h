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
  bool isClosed() const { return closed_; }
  // Gives up the tasks under way; the caller drops them.
  std::vector<std::shared_ptr<CurlURLTask>> close();

 private:
  static constexpr SteadyTime kNever = LoopTimer::kNever;

  void _open();
  void _closeMulti();
  std::unique_ptr<CurlTransfer> _takeTransfer();
  void _start(CurlTransfer& transfer);
  void _collectEnded();
  void _ended(CurlTransfer& transfer, CURLcode code);
  bool _follow(CurlTransfer& transfer, URLResult& result);
  void _finish(CurlTransfer& transfer, URLResult result);
  std::shared_ptr<CurlURLTask> _release(CurlTransfer& transfer);
  void _loopEnded();
  void _ready(curl_socket_t socket, std::uint32_t events);
  // Sets one of the times below, and with it when `_runDue` is wanted next.
  void _setDue(SteadyTime& which, SteadyTime time);
  void _runDue();
  void _endOverdue(SteadyTime now);

  static int _onSocket(CURL*, curl_socket_t socket, int what, void* self, void*);
  static int _onTimer(CURLM*, long milliseconds, void* self);

  // Fixed after construction.
  Loop& loop_;
  const CurlSettings settings_;

  // The loop's.
  bool open_ = false;
  bool retired_ = false;
  bool closed_ = false;
  long maximumIdle_;
  CURLSH* share_ = nullptr;
  CURLM* multi_ = nullptr;
  std::vector<std::unique_ptr<CurlTransfer>> active_;
  std::vector<std::unique_ptr<CurlTransfer>> idle_;
  bool fastOpenFails_ = false;
  SteadyTime curlDue_ = kNever;
  SteadyTime overdueCheck_ = kNever;  // no transfer is overdue before
  SteadyTime purgeDue_ = kNever;
  LoopTimer timer_;
  std::unordered_map<curl_socket_t, Subscription> watches_;
  Subscription loopEnd_;
};

}  // namespace zelkord
