#include <benchmark/benchmark.h>
#include <curl/curl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/url_sessions/CurlURLSessions.h"
#include "platform/testing/TestHTTPServer.h"

// What a request on a warm HTTPS connection costs. The floor is a bare libcurl multi loop on the
// caller's own thread, with one easy handle used again and again. The server is a process of its
// own, so that the processor time is the client's.

namespace zelkord {
namespace {

constexpr std::size_t kBodySize = 4096;

class ServerProcess {
 public:
  ServerProcess() : rootsFile_(std::filesystem::temp_directory_path() / "zelkord-bench-roots.pem") {
    const auto certificate = TestCertificate::make("127.0.0.1");
    std::ofstream(rootsFile_) << certificate.certificate;
    std::array<int, 2> ends{};
    if (pipe(ends.data()) != 0) std::abort();
    process_ = fork();
    if (process_ == 0) {
      TestHTTPServer server(certificate);
      server.reply("/", TestHTTPReply::make(200, std::string(kBodySize, 'x'),
                                            {{"Content-Type", "application/json"}}));
      const std::string url = server.url("/");
      if (write(ends[1], url.data(), url.size()) > 0) pause();
      _exit(0);
    }
    std::array<char, 256> url{};
    const ssize_t size = read(ends[0], url.data(), url.size());
    url_.assign(url.data(), static_cast<std::size_t>(std::max<ssize_t>(size, 0)));
    close(ends[0]);
    close(ends[1]);
  }
  ~ServerProcess() {
    kill(process_, SIGKILL);
    waitpid(process_, nullptr, 0);
    std::filesystem::remove(rootsFile_);
  }
  ServerProcess(const ServerProcess&) = delete;
  ServerProcess& operator=(const ServerProcess&) = delete;

  const std::string& url() const { return url_; }
  const std::string& rootsFile() const { return rootsFile_; }

 private:
  std::string rootsFile_;
  std::string url_;
  pid_t process_ = -1;
};

double processorMicroseconds() {
  rusage usage{};
  getrusage(RUSAGE_SELF, &usage);
  const auto of = [](const timeval& time) {
    return static_cast<double>(time.tv_sec) * 1e6 + static_cast<double>(time.tv_usec);
  };
  return of(usage.ru_utime) + of(usage.ru_stime);
}

// Runs `load` again and again; reports the median and the processor time of one.
template <typename Load>
void measure(benchmark::State& state, const Load& load) {
  load();
  std::vector<double> times;
  const double processorStart = processorMicroseconds();
  for (auto _ : state) {
    const auto start = std::chrono::steady_clock::now();
    load();
    const std::chrono::duration<double, std::micro> took = std::chrono::steady_clock::now() - start;
    times.push_back(took.count());
  }
  const double processor = processorMicroseconds() - processorStart;
  std::ranges::sort(times);
  state.counters["p50_us"] = times[times.size() / 2];
  state.counters["cpu_us"] = processor / static_cast<double>(times.size());
}

std::size_t appendBody(char* bytes, std::size_t, std::size_t size, void* body) {
  static_cast<std::string*>(body)->append(bytes, size);
  return size;
}

void BareCurlRequest(benchmark::State& state) {
  const ServerProcess server;
  CURLM* multi = curl_multi_init();
  CURL* easy = curl_easy_init();
  std::string body;
  curl_easy_setopt(easy, CURLOPT_URL, server.url().c_str());
  curl_easy_setopt(easy, CURLOPT_CAINFO, server.rootsFile().c_str());
  curl_easy_setopt(easy, CURLOPT_NOSIGNAL, 1L);
  curl_easy_setopt(easy, CURLOPT_ACCEPT_ENCODING, "gzip");
  curl_easy_setopt(easy, CURLOPT_WRITEFUNCTION, &appendBody);
  curl_easy_setopt(easy, CURLOPT_WRITEDATA, &body);
  measure(state, [&] {
    body.clear();
    curl_multi_add_handle(multi, easy);
    int running = 1;
    while (curl_multi_perform(multi, &running) == CURLM_OK && running > 0) {
      curl_multi_poll(multi, nullptr, 0, 1000, nullptr);
    }
    curl_multi_remove_handle(multi, easy);
  });
  if (body.size() != kBodySize) state.SkipWithError("no body");
  curl_easy_cleanup(easy);
  curl_multi_cleanup(multi);
}
BENCHMARK(BareCurlRequest)->UseRealTime();

void URLSessionRequest(benchmark::State& state) {
  const ServerProcess server;
  LinuxClock clock;
  LinuxWorkQueues queues(clock);
  CurlURLSessions sessions(queues, {.rootsFile = server.rootsFile()});
  const auto session = sessions.make({.name = "bench", .pipelining = true});
  const auto done = queues.makeSemaphore(0);
  std::size_t received = 0;
  measure(state, [&] {
    session
        ->dataTask({.url = server.url()},
                   [&](const auto&, const URLResult& result) {
                     received = result.dataLength();
                     done->signal();
                   })
        ->resume();
    done->wait(10s);
  });
  if (received != kBodySize) state.SkipWithError("no body");
}
BENCHMARK(URLSessionRequest)->UseRealTime();

}  // namespace
}  // namespace zelkord
