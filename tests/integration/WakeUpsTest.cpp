#include <fmt/format.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <systemd/sd-bus.h>

#include <algorithm>
#include <atomic>
#include <filesystem>
#include <fstream>
#include <string>

#include "platform/linux/ipc/BusPointers.h"
#include "platform/testing/TestHTTPServer.h"
#include "tests/integration/DaemonProcess.h"

// How many of the daemon's threads a call wakes up, by the kernel's own count.

namespace zelkord {
namespace {

constexpr const char* kAnswer =
    R"([{"status":"OK","query":"snow","completion_score":1,"max_age":600,"results":[]}])";

// A service in a process of its own, so that the daemon can be forked beside it.
class ServiceProcess {
 public:
  ServiceProcess()
      : board_(new (::mmap(nullptr, sizeof(Board), PROT_READ | PROT_WRITE,
                           MAP_SHARED | MAP_ANONYMOUS, -1, 0)) Board),
        child_(::fork()) {
    if (child_ == 0) _serve();
    while (board_->port == 0) ::usleep(1000);
  }
  ~ServiceProcess() {
    ::kill(child_, SIGKILL);
    ::waitpid(child_, nullptr, 0);
    ::munmap(board_, sizeof(Board));
  }
  ServiceProcess(const ServiceProcess&) = delete;
  ServiceProcess& operator=(const ServiceProcess&) = delete;

  int port() const { return board_->port; }
  int searches() const { return board_->searches; }

 private:
  struct Board {
    std::atomic<int> port = 0;
    std::atomic<int> searches = 0;
  };

  [[noreturn]] void _serve() {
    TestHTTPServer server;
    const auto bag = fmt::format(R"({{"version":"1","search_url":"{}","minimum_query_length":3}})",
                                 server.url("/search"));
    server.answerWith([this, bag](const TestHTTPRequest& request) {
      if (request.target.starts_with("/bag")) return TestHTTPReply::make(200, bag);
      if (request.target.starts_with("/search")) ++board_->searches;
      // Far enough away for the daemon to fall asleep meanwhile.
      return TestHTTPReply::make(200, kAnswer).dripping(4096, 5ms);
    });
    board_->port = server.port();
    for (;;) ::pause();
  }

  Board* const board_;
  const pid_t child_;
};

class WakeUpsTest : public testing::Test {
 protected:
  void SetUp() override {
    root_.write("XDG_CONFIG_DIRS/com.quenta.zelkord/defaults.json",
                fmt::format(R"({{"ZLKBagURL": "http://127.0.0.1:{}/bag"}})", service_.port()));
    daemon_.emplace(root_);
    const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(60);
    while (!_connects() && std::chrono::steady_clock::now() < limit) ::usleep(1000);
    ASSERT_TRUE(bus_);
    ASSERT_GE(_call("Configure", "a{sv}", 2, "identifier", "s", "lanthe", "userAgent", "s", "A"),
              0);
    // Until the bag is there.
    while (service_.searches() == 0 && std::chrono::steady_clock::now() < limit) search("snow");
    ASSERT_GT(service_.searches(), 0);
  }

  void search(const char* text) {
    EXPECT_GE(_call("Request", "sa{sv}", "search", 2, "queryId", "x", ++queryId_, "queryString",
                    "s", text),
              0);
  }
  // One that is not looked for in the cache.
  void searchAnew(const char* text) {
    EXPECT_GE(_call("Request", "sa{sv}", "search", 3, "queryId", "x", ++queryId_, "queryString",
                    "s", text, "queryItems", "a(ss)", 1, "x", "y"),
              0);
  }
  // Times that the daemon's threads have gone to sleep, for a call: the least of some batches,
  // since whatever else the machine does comes on top.
  double wakeUps(const std::function<void()>& call) {
    constexpr int kBatches = 15;
    constexpr int kCalls = 20;
    std::int64_t least = INT64_MAX;
    for (int batch = 0; batch < kBatches; ++batch) {
      const auto before = _sleeps();
      for (int i = 0; i < kCalls; ++i) call();
      ::usleep(20'000);  // what is done after the answer
      least = std::min(least, _sleeps() - before);
    }
    return static_cast<double>(least) / kCalls;
  }

  const ServiceProcess service_;

 private:
  bool _connects() {
    sd_bus* bus = nullptr;
    sd_bus_new(&bus);
    bus_.reset(bus);
    sd_bus_set_address(bus, ("unix:path=" + DaemonProcess::socketOf(root_)).c_str());
    if (sd_bus_start(bus) < 0) bus_.reset();
    return bus_ != nullptr;
  }
  template <typename... A>
  int _call(const char* member, const char* types, A... values) {
    return sd_bus_call_method(bus_.get(), "com.quenta.zelkord", "/com/quenta/zelkord",
                              "com.quenta.zelkord.Daemon1", member, nullptr, nullptr, types,
                              values...);
  }
  std::int64_t _sleeps() const {
    std::int64_t sum = 0;
    for (const auto& thread :
         std::filesystem::directory_iterator(fmt::format("/proc/{}/task", daemon_->pid()))) {
      std::ifstream status(thread.path() / "status");
      for (std::string word; status >> word;) {
        std::int64_t count = 0;
        if (word == "voluntary_ctxt_switches:" && status >> count) sum += count;
      }
    }
    return sum;
  }

  const TemporaryDirectory root_;
  std::optional<DaemonProcess> daemon_;
  ipc::BusPtr bus_;
  std::int64_t queryId_ = 0;
};

TEST_F(WakeUpsTest, OneForWhatTheDaemonAnswersItselfTwoForTheService) {
  EXPECT_LE(wakeUps([this] { search("s"); }), 1.2) << "below the minimum length";
  const int before = service_.searches();
  EXPECT_LE(wakeUps([this] { search("snow"); }), 1.2) << "from the cache";
  EXPECT_EQ(service_.searches(), before);
  EXPECT_LE(wakeUps([this] { searchAnew("snow"); }), 2.4) << "from the service";
  EXPECT_EQ(service_.searches(), before + 15 * 20);
}

}  // namespace
}  // namespace zelkord
