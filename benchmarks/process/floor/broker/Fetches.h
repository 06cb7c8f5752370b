#pragma once

#include <curl/curl.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace zelkord::bench {

// Requests on one libcurl multi handle, with the TLS and HTTP settings of the daemon's queries;
// connections and handles are used again.
//
// Threading: the thread that waits at `epoll`, where it registers its sockets. Lives as long as the
// program.
class Fetches {
 public:
  // `body` is null when there was no answer with a 2xx.
  using Done = std::function<void(const std::string* body)>;

  // All requests have these header lines.
  Fetches(int epoll, const std::vector<std::string>& headers);
  Fetches(const Fetches&) = delete;
  Fetches& operator=(const Fetches&) = delete;

  void begin(const std::string& url, Done done);
  // To be called with what epoll said of a descriptor.
  void ready(int descriptor, std::uint32_t events);
  // To be called when that many milliseconds have passed; negative: no need to.
  int timeUntilDue() const;
  void runDue();

  // A name or value of a query.
  std::string escaped(std::string_view text) const;

 private:
  using Clock = std::chrono::steady_clock;
  struct Fetch {
    CURL* easy = nullptr;
    std::string body;
    Done done;
  };

  Fetch& _take();
  void _prepare(Fetch& fetch);
  void _act(int descriptor, int events);
  void _finish(CURL* easy, CURLcode result);

  static int _onSocket(CURL*, curl_socket_t socket, int what, void* self, void* known);
  static int _onTimer(CURLM*, long milliseconds, void* self);
  static std::size_t _onBody(char* bytes, std::size_t, std::size_t size, void* body);

  const int epoll_;
  CURLM* const multi_;
  CURLSH* const share_;
  curl_slist* headers_ = nullptr;
  std::vector<std::unique_ptr<Fetch>> all_;
  std::vector<Fetch*> idle_;
  Clock::time_point due_ = Clock::time_point::max();
};

}  // namespace zelkord::bench
