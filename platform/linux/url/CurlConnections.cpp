#include "platform/linux/url/CurlConnections.h"

#include <sys/epoll.h>

#include <algorithm>
#include <utility>
#include <variant>

#include "base/Check.h"
#include "platform/linux/url/RequestPolicy.h"

namespace zelkord {
namespace {

constexpr std::size_t kMaximumIdleHandles = 32;
constexpr Duration kMaximumIdleTime = 118s;

}  // namespace

CurlConnections::CurlConnections(Loop& loop, CurlSettings settings)
    : loop_(loop),
      settings_(std::move(settings)),
      maximumIdle_(settings_.maximumIdleConnections),
      timer_(loop, [this] {
        loop_.assertCurrent();
        _runDue();
      }) {}

CurlConnections::~CurlConnections() { ZK_CHECK(!open_, "connections are closed before their end"); }

void CurlConnections::begin(std::shared_ptr<CurlURLTask> task, CurlURLTask::Order order,
                            TransferPlace place) {
  loop_.assertCurrent();
  ZK_CHECK(!retired_ && !closed_, "retired connections take no more tasks");
  _open();
  active_.push_back(_takeTransfer());
  CurlTransfer& transfer = *active_.back();
  transfer.place = active_.size() - 1;
  const bool metered = settings_.isMetered();
  transfer.setMaximumIdleTime(metered ? settings_.meteredIdleTime : kMaximumIdleTime);
  transfer.begin(std::move(task), std::move(order), std::move(place));
  _start(transfer);
}

bool CurlConnections::cancel(CurlURLTask& task) {
  loop_.assertCurrent();
  if (!task.transfer) return false;
  CurlTransfer& transfer = *task.transfer;
  if (transfer.place >= active_.size() || active_[transfer.place].get() != &transfer) return false;
  curl_multi_remove_handle(multi_, transfer.handle());
  transfer.recordTiming(false);
  _finish(transfer, {});
  return true;
}

bool CurlConnections::isClosed() const {
  loop_.assertCurrent();
  return closed_;
}

void CurlConnections::setMaximumIdle(long count) {
  loop_.assertCurrent();
  maximumIdle_ = count;
  if (multi_) curl_multi_setopt(multi_, CURLMOPT_MAXCONNECTS, maximumIdle_);
}

void CurlConnections::retire() {
  loop_.assertCurrent();
  retired_ = true;
  if (active_.empty()) close();
}

std::vector<std::shared_ptr<CurlURLTask>> CurlConnections::close() {
  loop_.assertCurrent();
  std::vector<std::shared_ptr<CurlURLTask>> dropped;
  closed_ = true;
  if (!std::exchange(open_, false)) return dropped;
  while (!active_.empty()) {
    curl_multi_remove_handle(multi_, active_.back()->handle());
    dropped.push_back(_release(*active_.back()));
  }
  _closeMulti();
  idle_.clear();
  curl_share_cleanup(std::exchange(share_, nullptr));
  loopEnd_.reset();
  return dropped;
}

void CurlConnections::_loopEnded() {
  while (!active_.empty()) {
    CurlTransfer& transfer = *active_.back();
    curl_multi_remove_handle(multi_, transfer.handle());
    _finish(transfer, {.error = urlError(URLErrorCode::Cancelled, "loading has ended")});
  }
  const auto dropped = close();
  ZK_CHECK(dropped.empty(), "all tasks have ended");
}

void CurlConnections::_open() {
  _setDue(purgeDue_, kNever);
  if (!std::exchange(open_, true)) {
    loopEnd_ = loop_.atEnd([this] {
      loop_.assertCurrent();
      _loopEnded();
    });
    share_ = curl_share_init();
    curl_share_setopt(share_, CURLSHOPT_SHARE, CURL_LOCK_DATA_SSL_SESSION);
  }
  if (multi_) return;
  multi_ = curl_multi_init();
  ZK_CHECK(multi_ && share_, "multi and share handles are made");
  curl_multi_setopt(multi_, CURLMOPT_SOCKETFUNCTION, &CurlConnections::_onSocket);
  curl_multi_setopt(multi_, CURLMOPT_SOCKETDATA, this);
  curl_multi_setopt(multi_, CURLMOPT_TIMERFUNCTION, &CurlConnections::_onTimer);
  curl_multi_setopt(multi_, CURLMOPT_TIMERDATA, this);
  curl_multi_setopt(multi_, CURLMOPT_MAXCONNECTS, maximumIdle_);
  curl_multi_setopt(multi_, CURLMOPT_PIPELINING,
                    settings_.multiplexes ? CURLPIPE_MULTIPLEX : CURLPIPE_NOTHING);
}

void CurlConnections::_closeMulti() {
  curl_multi_cleanup(std::exchange(multi_, nullptr));
  watches_.clear();
  curlDue_ = overdueCheck_ = purgeDue_ = kNever;
  timer_.set(kNever);
}

std::unique_ptr<CurlTransfer> CurlConnections::_takeTransfer() {
  if (idle_.empty()) return std::make_unique<CurlTransfer>(loop_, settings_, share_);
  auto transfer = std::move(idle_.back());
  idle_.pop_back();
  return transfer;
}

void CurlConnections::_start(CurlTransfer& transfer) {
  if (fastOpenFails_) transfer.disableFastOpen();
  _setDue(overdueCheck_, std::min(overdueCheck_, transfer.deadline()));
  const CURLMcode code = curl_multi_add_handle(multi_, transfer.handle());
  if (code == CURLM_OK) return;
  _finish(transfer, {.error = urlError(URLErrorCode::Other, curl_multi_strerror(code))});
}

void CurlConnections::_ready(curl_socket_t socket, std::uint32_t events) {
  int bits = (events & EPOLLIN ? CURL_CSELECT_IN : 0) | (events & EPOLLOUT ? CURL_CSELECT_OUT : 0);
  if (events & (EPOLLERR | EPOLLHUP)) bits |= CURL_CSELECT_ERR;
  int running = 0;
  curl_multi_socket_action(multi_, socket, bits, &running);
  _collectEnded();
}

void CurlConnections::_setDue(SteadyTime& which, SteadyTime time) {
  which = time;
  timer_.set(std::min({curlDue_, overdueCheck_, purgeDue_}));
}

void CurlConnections::_runDue() {
  const auto now = steadyNow();
  if (curlDue_ <= now) {
    curlDue_ = kNever;
    int running = 0;
    curl_multi_socket_action(multi_, CURL_SOCKET_TIMEOUT, 0, &running);
    _collectEnded();
  }
  if (overdueCheck_ <= now) _endOverdue(now);
  if (purgeDue_ > now) return _setDue(purgeDue_, purgeDue_);
  retired_ ? retire() : _closeMulti();
}

void CurlConnections::_endOverdue(SteadyTime now) {
  overdueCheck_ = kNever;
  for (std::size_t i = active_.size(); i-- > 0;) {
    CurlTransfer& transfer = *active_[i];
    const SteadyTime deadline = transfer.deadline();
    if (deadline > now) {
      overdueCheck_ = std::min(overdueCheck_, deadline);
      continue;
    }
    curl_multi_remove_handle(multi_, transfer.handle());
    _ended(transfer, CURLE_OPERATION_TIMEDOUT);
  }
}

void CurlConnections::_collectEnded() {
  int left = 0;
  while (const CURLMsg* message = curl_multi_info_read(multi_, &left)) {
    if (message->msg != CURLMSG_DONE) continue;
    const CURLcode code = message->data.result;
    CurlTransfer& transfer = CurlTransfer::of(message->easy_handle);
    curl_multi_remove_handle(multi_, message->easy_handle);
    _ended(transfer, code);
  }
}

void CurlConnections::_ended(CurlTransfer& transfer, CURLcode code) {
  if (transfer.givesUpFastOpen(code)) {
    transfer.restart(transfer.request());
    return _start(transfer);
  }
  fastOpenFails_ = fastOpenFails_ || (code == CURLE_OK && transfer.hasGivenUpFastOpen());
  URLResult result = transfer.takeResult(code);
  transfer.recordTiming(result.response.has_value());
  if (!result.error && isRedirect(*result.response) && _follow(transfer, result)) return;
  _finish(transfer, std::move(result));
}

// False, with the error in the result, when the redirect is not followed.
bool CurlConnections::_follow(CurlTransfer& transfer, URLResult& result) {
  if (++transfer.redirects > kMaximumRedirects) {
    result.error = urlError(URLErrorCode::TooManyRedirects, "too many redirects");
    return false;
  }
  auto next = redirected(*transfer.request(), *result.response);
  if (auto* error = std::get_if<Error>(&next)) {
    result.error = std::move(*error);
    return false;
  }
  const auto& accepts = transfer.request()->acceptsRedirect;
  if (accepts && !accepts(std::get<URLRequest>(next).url)) {
    result.error = urlError(URLErrorCode::UnsupportedURL, "redirect not accepted");
    return false;
  }
  auto request = std::make_shared<const URLRequest>(std::move(std::get<URLRequest>(next)));
  transfer.task().setRequest(request);
  transfer.restart(std::move(request));
  _start(transfer);
  return true;
}

void CurlConnections::_finish(CurlTransfer& transfer, URLResult result) {
  TimingData timing = transfer.timing();
  auto information = transfer.connectionInformation();
  const auto task = _release(transfer);
  task->finish(std::move(result), std::move(timing), std::move(information));
}

// Takes the transfer, which the multi handle has no more, off the active ones.
std::shared_ptr<CurlURLTask> CurlConnections::_release(CurlTransfer& transfer) {
  auto task = transfer.endTask();
  const std::size_t place = transfer.place;
  std::swap(active_[place], active_.back());
  active_[place]->place = place;
  if (idle_.size() < kMaximumIdleHandles) idle_.push_back(std::move(active_.back()));
  active_.pop_back();
  if (active_.empty()) {
    _setDue(overdueCheck_, kNever);
    // Not at once: libcurl may be at work.
    if (retired_) _setDue(purgeDue_, steadyNow());
    if (!retired_ && settings_.isMetered()) {
      _setDue(purgeDue_, steadyNow() + settings_.meteredIdleTime);
    }
  }
  return task;
}

void CurlConnections::_watch(curl_socket_t socket, std::uint32_t events) {
  auto& watch = watches_[socket];
  if (watch) return loop_.changeEvents(socket, events);
  watch = loop_.watch(socket, events, [this, socket](std::uint32_t arrived) {
    loop_.assertCurrent();
    _ready(socket, arrived);
  });
}

int CurlConnections::_onSocket(CURL*, curl_socket_t socket, int what, void* self, void*) {
  auto& connections = *static_cast<CurlConnections*>(self);
  connections.loop_.assertCurrent();
  if (what == CURL_POLL_REMOVE) {
    connections.watches_.erase(socket);
    return 0;
  }
  const std::uint32_t events =
      (what & CURL_POLL_IN ? EPOLLIN : 0u) | (what & CURL_POLL_OUT ? EPOLLOUT : 0u);
  connections._watch(socket, events);
  return 0;
}

int CurlConnections::_onTimer(CURLM*, long milliseconds, void* self) {
  auto& connections = *static_cast<CurlConnections*>(self);
  connections.loop_.assertCurrent();
  const auto due =
      milliseconds < 0 ? kNever : steadyNow() + std::chrono::milliseconds(milliseconds);
  connections._setDue(connections.curlDue_, due);
  return 0;
}

}  // namespace zelkord
