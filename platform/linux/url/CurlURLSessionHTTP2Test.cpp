#include <fcntl.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "base/Check.h"
#include "platform/linux/url/URLSessionTestSupport.h"
#include "platform/testing/TestCertificate.h"
#include "platform/testing/TestHTTP2Server.h"

namespace zelkord {
namespace {

constexpr const char* kHTTP2Server = "/usr/sbin/nghttpd";

// A port that is free at the moment.
int freePort() {
  const int socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  socklen_t size = sizeof address;
  bind(socket, reinterpret_cast<sockaddr*>(&address), size);
  getsockname(socket, reinterpret_cast<sockaddr*>(&address), &size);
  ::close(socket);
  return ntohs(address.sin_port);
}

// The HTTP/2 server of the nghttp2 project, serving one empty folder with one file.
class HTTP2ServerProcess {
 public:
  HTTP2ServerProcess()
      : certificate_(TestCertificate::make("127.0.0.1")),
        roots_(certificate_.certificate),
        key_(certificate_.privateKey),
        folder_(roots_.path() + ".d") {
    std::filesystem::create_directory(folder_);
    std::ofstream(folder_ + "/file") << "over http/2";
    for (int attempt = 0; attempt < 5 && process_ < 0; ++attempt) _start(freePort());
  }
  ~HTTP2ServerProcess() {
    _stop();
    std::filesystem::remove_all(folder_);
  }
  HTTP2ServerProcess(const HTTP2ServerProcess&) = delete;
  HTTP2ServerProcess& operator=(const HTTP2ServerProcess&) = delete;

  bool isRunning() const { return process_ > 0; }
  const std::string& rootsFile() const { return roots_.path(); }
  std::string url() const { return "https://127.0.0.1:" + std::to_string(port_) + "/file"; }

 private:
  void _start(int port) {
    std::array<int, 2> output{};
    ZK_CHECK(pipe2(output.data(), O_CLOEXEC) == 0, "a pipe is made");
    const std::string portText = std::to_string(port);
    process_ = fork();
    if (process_ == 0) {
      dup2(output[1], STDOUT_FILENO);
      execl(kHTTP2Server, kHTTP2Server, "-v", "-a", "127.0.0.1", "-d", folder_.c_str(),
            portText.c_str(), key_.path().c_str(), roots_.path().c_str(), nullptr);
      _exit(127);
    }
    ::close(output[1]);
    port_ = port;
    // It says "listen" once it does, or ends because the port is taken.
    std::string said;
    std::array<char, 256> buffer{};
    ssize_t count = 0;
    while (said.find("listen") == std::string::npos &&
           (count = read(output[0], buffer.data(), buffer.size())) > 0) {
      said.append(buffer.data(), static_cast<std::size_t>(count));
    }
    output_ = output[0];
    if (count <= 0) _stop();
  }
  void _stop() {
    if (process_ > 0) {
      kill(process_, SIGTERM);
      waitpid(process_, nullptr, 0);
    }
    process_ = -1;
    if (output_ >= 0) ::close(std::exchange(output_, -1));
  }

  const TestCertificate certificate_;
  const URLTestFile roots_;
  const URLTestFile key_;
  const std::string folder_;
  pid_t process_ = -1;
  int port_ = 0;
  int output_ = -1;
};

TEST(CurlURLSessionHTTP2Test, SendsManyRequestsOverOneConnection) {
  if (access(kHTTP2Server, X_OK) != 0) GTEST_SKIP() << "nghttpd (nghttp2-server) is not installed";
  const HTTP2ServerProcess server;
  ASSERT_TRUE(server.isRunning());
  URLSessionTestBed bed({.rootsFile = server.rootsFile()});
  const auto session = bed.make({.name = "test", .pipelining = true});
  constexpr std::size_t kRequests = 20;
  URLResults results;
  std::vector<std::shared_ptr<URLTask>> tasks;
  for (std::size_t i = 0; i < kRequests; ++i) {
    tasks.push_back(session->dataTask({.url = server.url(), .headers = {{"X-Quenta-A", "b"}}},
                                      results.completion()));
    tasks.back()->resume();
  }
  for (const auto& result : results.wait(kRequests)) {
    EXPECT_EQ(result.status(), 200);
    EXPECT_EQ(result.data->view(), "over http/2");
  }
  int connections = 0;
  for (const auto& task : tasks) {
    EXPECT_EQ(task->timingData().protocol, "h2");
    connections += !task->timingData().reused;
  }
  EXPECT_EQ(connections, 1);
  EXPECT_EQ(loadURL(*session, {.url = server.url() + "/none"}).result.status(), 404);
}

TEST(CurlURLSessionHTTP2Test, OutlivesResetStreamsAndConnectionsThatGoAway) {
  using Action = TestHTTP2Server::Action;
  const auto certificate = TestCertificate::make("127.0.0.1");
  const URLTestFile roots(certificate.certificate);
  const struct {
    const char* name;
    Action action;
    std::int64_t code;  // of the request that meets it
    const char* text;
    bool keepsConnection;  // for the next one
  } cases[] = {
      {"reset", Action::Reset, -1005, "", true},
      {"reset half-way", Action::ResetHalfWay, -1005, "hel", true},
      {"answered, then away", Action::AnswerAndGoAway, 0, "hello", false},
      {"away, unanswered", Action::GoAwayAndClose, -1005, "", false},
  };
  for (const auto& [name, action, code, text, keepsConnection] : cases) {
    SCOPED_TRACE(name);
    TestHTTP2Server server(certificate, {Action::Answer, action});
    URLSessionTestBed bed({.rootsFile = roots.path()});
    const auto session = bed.make({.name = "test", .pipelining = true});
    const URLRequest request{.url = server.url(), .timeout = 10s};
    EXPECT_EQ(loadURL(*session, request).text(), "hello");
    const auto met = loadURL(*session, request);
    EXPECT_EQ(met.errorCode(), code);
    EXPECT_EQ(met.text(), text);
    const auto next = loadURL(*session, request);
    EXPECT_EQ(next.text(), "hello");
    EXPECT_EQ(next.timing.protocol, "h2");
    EXPECT_EQ(server.connections(), keepsConnection ? 1 : 2);
  }
}

}  // namespace
}  // namespace zelkord
