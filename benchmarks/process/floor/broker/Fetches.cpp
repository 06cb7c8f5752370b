#include "benchmarks/process/floor/broker/Fetches.h"

#include <sys/epoll.h>

#include <utility>

#include "platform/linux/url/CurlOptions.h"
#include "platform/linux/url_sessions/CurlURLSessions.h"

namespace zelkord::bench {
namespace {

// As those of the daemon's session for queries.
constexpr long kIdleConnections = 32;
constexpr long kIdleSeconds = 118;
constexpr long kTimeoutSeconds = 30;

CurlSettings settings() {
  return {.rootsFile = CurlURLSessions::rootsFileOfEnvironment(),
          .multiplexes = true,
          .tlsSessionTickets = true};
}

}  // namespace

Fetches::Fetches(int epoll, const std::vector<std::string>& headers)
    : epoll_(epoll), multi_(curl_multi_init()), share_(curl_share_init()) {
  for (const auto& line : headers) headers_ = curl_slist_append(headers_, line.c_str());
  curl_share_setopt(share_, CURLSHOPT_SHARE, CURL_LOCK_DATA_SSL_SESSION);
  curl_multi_setopt(multi_, CURLMOPT_SOCKETFUNCTION, &Fetches::_onSocket);
  curl_multi_setopt(multi_, CURLMOPT_SOCKETDATA, this);
  curl_multi_setopt(multi_, CURLMOPT_TIMERFUNCTION, &Fetches::_onTimer);
  curl_multi_setopt(multi_, CURLMOPT_TIMERDATA, this);
  curl_multi_setopt(multi_, CURLMOPT_MAXCONNECTS, kIdleConnections);
  curl_multi_setopt(multi_, CURLMOPT_PIPELINING, CURLPIPE_MULTIPLEX);
}

void Fetches::begin(const std::string& url, Done done) {
  auto& fetch = _take();
  fetch.body.clear();
  fetch.done = std::move(done);
  curl_easy_setopt(fetch.easy, CURLOPT_URL, url.c_str());
  curl_multi_add_handle(multi_, fetch.easy);
}

Fetches::Fetch& Fetches::_take() {
  if (idle_.empty()) {
    _prepare(*all_.emplace_back(std::make_unique<Fetch>()));
    return *all_.back();
  }
  auto* fetch = idle_.back();
  idle_.pop_back();
  return *fetch;
}

void Fetches::_prepare(Fetch& fetch) {
  fetch.easy = curl_easy_init();
  setCommonOptions(fetch.easy, settings(), share_);
  curl_easy_setopt(fetch.easy, CURLOPT_HTTPHEADER, headers_);
  curl_easy_setopt(fetch.easy, CURLOPT_PIPEWAIT, 1L);
  curl_easy_setopt(fetch.easy, CURLOPT_MAXAGE_CONN, kIdleSeconds);
  curl_easy_setopt(fetch.easy, CURLOPT_CONNECTTIMEOUT, kTimeoutSeconds);
  curl_easy_setopt(fetch.easy, CURLOPT_WRITEFUNCTION, &Fetches::_onBody);
  curl_easy_setopt(fetch.easy, CURLOPT_WRITEDATA, &fetch.body);
  curl_easy_setopt(fetch.easy, CURLOPT_PRIVATE, &fetch);
}

void Fetches::ready(int descriptor, std::uint32_t events) {
  const int bits = ((events & EPOLLIN) ? CURL_CSELECT_IN : 0) |
                   ((events & EPOLLOUT) ? CURL_CSELECT_OUT : 0) |
                   ((events & (EPOLLERR | EPOLLHUP)) ? CURL_CSELECT_ERR : 0);
  _act(descriptor, bits);
}

int Fetches::timeUntilDue() const {
  if (due_ == Clock::time_point::max()) return -1;
  const auto left = std::chrono::ceil<std::chrono::milliseconds>(due_ - Clock::now()).count();
  return left > 0 ? static_cast<int>(left) : 0;
}

void Fetches::runDue() {
  if (due_ == Clock::time_point::max() || due_ > Clock::now()) return;
  due_ = Clock::time_point::max();
  _act(CURL_SOCKET_TIMEOUT, 0);
}

void Fetches::_act(int descriptor, int events) {
  int running = 0;
  curl_multi_socket_action(multi_, descriptor, events, &running);
  int left = 0;
  while (const CURLMsg* message = curl_multi_info_read(multi_, &left)) {
    _finish(message->easy_handle, message->data.result);
  }
}

void Fetches::_finish(CURL* easy, CURLcode result) {
  char* place = nullptr;
  long status = 0;
  curl_easy_getinfo(easy, CURLINFO_PRIVATE, &place);
  curl_easy_getinfo(easy, CURLINFO_RESPONSE_CODE, &status);
  curl_multi_remove_handle(multi_, easy);
  auto& fetch = *static_cast<Fetch*>(static_cast<void*>(place));
  std::exchange(fetch.done,
                nullptr)(result == CURLE_OK && status / 100 == 2 ? &fetch.body : nullptr);
  idle_.push_back(&fetch);
}

std::string Fetches::escaped(std::string_view text) const {
  const std::unique_ptr<char, void (*)(void*)> safe(
      curl_easy_escape(nullptr, text.data(), static_cast<int>(text.size())), &curl_free);
  return safe.get();
}

int Fetches::_onSocket(CURL*, curl_socket_t socket, int what, void* self, void* known) {
  auto& fetches = *static_cast<Fetches*>(self);
  if (what == CURL_POLL_REMOVE) {
    ::epoll_ctl(fetches.epoll_, EPOLL_CTL_DEL, socket, nullptr);
    return 0;
  }
  epoll_event event{};
  event.events = ((what & CURL_POLL_IN) ? EPOLLIN : 0U) | ((what & CURL_POLL_OUT) ? EPOLLOUT : 0U);
  event.data.fd = socket;
  ::epoll_ctl(fetches.epoll_, known ? EPOLL_CTL_MOD : EPOLL_CTL_ADD, socket, &event);
  curl_multi_assign(fetches.multi_, socket, self);
  return 0;
}

int Fetches::_onTimer(CURLM*, long milliseconds, void* self) {
  static_cast<Fetches*>(self)->due_ = milliseconds < 0
                                          ? Clock::time_point::max()
                                          : Clock::now() + std::chrono::milliseconds(milliseconds);
  return 0;
}

std::size_t Fetches::_onBody(char* bytes, std::size_t, std::size_t size, void* body) {
  static_cast<std::string*>(body)->append(bytes, size);
  return size;
}

}  // namespace zelkord::bench
