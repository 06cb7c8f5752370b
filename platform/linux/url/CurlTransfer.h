#pragma once

#include <curl/curl.h>

#include <array>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "platform/api/URLRequest.h"
#include "platform/linux/loop/Loop.h"
#include "platform/linux/url/CurlSettings.h"
#include "platform/linux/url/CurlURLTask.h"
#include "platform/linux/url/HeaderLines.h"
#include "platform/linux/url/ResponseCollector.h"
#include "platform/linux/url/TransferPlace.h"

namespace zelkord {

// An easy handle and what it needs while it carries a task: one request after the other
// (redirects), then another task. Handles are costly to make, so they are set up once and used
// again.
//
// States: idle, or carrying a task (`begin` to `endTask`); between `begin` and the handle's removal
// from the multi handle, libcurl calls back into it.
//
// Threading: the loop; destroyed on any. Ownership: the loop and `share` outlive it.
class CurlTransfer final {
 public:
  CurlTransfer(const Loop& loop, const CurlSettings& settings, CURLSH* share);
  ~CurlTransfer();
  CurlTransfer(const CurlTransfer&) = delete;
  CurlTransfer& operator=(const CurlTransfer&) = delete;

  static CurlTransfer& of(CURL* handle);
  CURL* handle() const { return handle_; }

  // Takes a task up and sets the handle for its request.
  void begin(std::shared_ptr<CurlURLTask> task, CurlURLTask::Order order, TransferPlace taken);
  // Sets the handle for another request of the same task: after a redirect, or the same again.
  void restart(std::shared_ptr<const URLRequest> request);
  // Gives the task back and is idle.
  std::shared_ptr<CurlURLTask> endTask();

  CurlURLTask& task() const { return *task_; }
  const std::shared_ptr<const URLRequest>& request() const { return order_.request; }
  // When the task, as far as is known, will have made no progress or lasted for too long.
  SteadyTime deadline() const;
  // How long a connection may have been idle to be used by the next request.
  void setMaximumIdleTime(Duration duration);

  // Of a request that has ended with `code`: the error, if any, and what came before it.
  URLResult takeResult(CURLcode code);
  // Adds what the request that has ended moved and took to the task's timing data.
  void recordTiming(bool hasResponse);
  const TimingData& timing() const { return timing_; }
  // What is known of the proxy's connection; none for a request that was not proxied.
  std::optional<json::object> connectionInformation() const;
  // Goes without fast open from now on. False when it did already, or the failed request may have
  // reached somebody.
  bool givesUpFastOpen(CURLcode code);
  bool hasGivenUpFastOpen() const { return hasFastOpen_ && !fastOpen_; }
  void disableFastOpen();

  int redirects = 0;
  std::size_t place = 0;  // among the active transfers

 private:
  void _setCallbacks();
  void _setFastOpen(bool on);
  void _setMethodAndBody();
  void _setProxy();
  void _setTimeout();
  double _milliseconds(CURLINFO time) const;

  static std::size_t _onHeader(char* bytes, std::size_t, std::size_t size, void* self);
  static std::size_t _onBody(char* bytes, std::size_t, std::size_t size, void* self);
  static int _onRequest(void* self, char* peer, char* local, int peerPort, int localPort);
  static int _onProgress(void* self, curl_off_t, curl_off_t received, curl_off_t, curl_off_t sent);

  // Fixed after construction.
  const Loop& loop_;
  CURL* const handle_;
  const bool hasFastOpen_;
  const bool multiplexes_;
  const std::shared_ptr<InterfaceNames> interfaces_;

  // Of the task.
  std::shared_ptr<CurlURLTask> task_;
  CurlURLTask::Order order_;  // with the request of the moment
  TransferPlace taken_;
  TimingData timing_;
  bool fastOpen_ = false;

  // Of the request.
  HeaderLines headerLines_;
  ResponseCollector response_;
  SteadyTime begun_{};
  SteadyTime progressed_{};
  curl_off_t bytesMoved_ = 0;
  int requestsSent_ = 0;
  bool repeatRefused_ = false;
  bool proxied_ = false;
  std::array<char, CURL_ERROR_SIZE> errorText_{};
};

}  // namespace zelkord
