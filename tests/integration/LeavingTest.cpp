#include <arpa/inet.h>
#include <fmt/format.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sqlite3.h>
#include <sys/mman.h>
#include <systemd/sd-bus.h>

#include <atomic>
#include <string>
#include <vector>

#include "platform/linux/ipc/BusPointers.h"
#include "tests/integration/DaemonProcess.h"

// The daemon as clients meet it while very many of them wait for a bag that does not come.

namespace zelkord {
namespace {

using Steady = std::chrono::steady_clock;

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr int kSlowness = 10;
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
constexpr int kSlowness = 10;
#else
constexpr int kSlowness = 1;
#endif
#else
constexpr int kSlowness = 1;
#endif

constexpr int kClientProcesses = 5;
constexpr int kConnectionsOfOne = 180;
constexpr int kAll = kClientProcesses * kConnectionsOfOne;
constexpr auto kPatience = std::chrono::seconds(20 * kSlowness);

// What the client processes and the test tell each other.
struct Board {
  std::atomic<int> ready = 0;  // connections that are configured
  std::atomic<int> round = 0;  // all ask for the bag when it becomes larger
  std::atomic<int> asked = 0;  // in this round
  std::atomic<int> answered = 0;
  std::atomic<int> slowest = 0;  // of the answers, in milliseconds
};

int millisecondsSince(Steady::time_point start) {
  const auto elapsed = std::chrono::duration_cast<std::chrono::milliseconds>(Steady::now() - start);
  return static_cast<int>(elapsed.count());
}

ipc::BusPtr connectTo(const std::string& socket) {
  sd_bus* bus = nullptr;
  sd_bus_new(&bus);
  ipc::BusPtr owned(bus);
  sd_bus_set_address(bus, ("unix:path=" + socket).c_str());
  sd_bus_set_method_call_timeout(bus, 60'000'000);
  return sd_bus_start(bus) >= 0 ? std::move(owned) : nullptr;
}

template <typename... A>
bool call(sd_bus* bus, const char* interface, const char* member, const char* types, A... values) {
  return bus && sd_bus_call_method(bus, "com.quenta.zelkord", "/com/quenta/zelkord", interface,
                                   member, nullptr, nullptr, types, values...) >= 0;
}

bool configure(sd_bus* bus) {
  return call(bus, "com.quenta.zelkord.Daemon1", "Configure", "a{sv}", 2, "identifier", "s",
              "lanthe", "userAgent", "s", "Lanthe/9");
}

// One of the client processes.
class Asker final {
 public:
  Asker(const std::string& socket, Board& board) : board_(board) {
    for (int i = 0; i < kConnectionsOfOne; ++i) {
      connections_.push_back(connectTo(socket));
      if (configure(connections_.back().get())) ++board_.ready;
    }
  }

  [[noreturn]] void askForEver() {
    for (int round = 1;; ++round) {
      while (board_.round < round) ::usleep(1000);
      start_ = Steady::now();
      for (const auto& bus : connections_) _ask(bus.get());
      while (waiting_ > 0) _process();
    }
  }

 private:
  void _ask(sd_bus* bus) {
    sd_bus_call_method_async(bus, nullptr, "com.quenta.zelkord", "/com/quenta/zelkord",
                             "com.quenta.zelkord.Daemon1", "Bag", &Asker::_onAnswer, this, "");
    sd_bus_flush(bus);
    ++waiting_;
    ++board_.asked;
  }

  static int _onAnswer(sd_bus_message* answer, void* self, sd_bus_error*) {
    auto& asker = *static_cast<Asker*>(self);
    if (sd_bus_message_is_method_error(answer, nullptr)) return 0;  // counts as none
    const int took = millisecondsSince(asker.start_);
    int slowest = asker.board_.slowest;
    while (took > slowest && !asker.board_.slowest.compare_exchange_weak(slowest, took)) {
    }
    ++asker.board_.answered;
    --asker.waiting_;
    return 0;
  }

  void _process() {
    std::vector<pollfd> polled;
    for (const auto& bus : connections_) polled.push_back({sd_bus_get_fd(bus.get()), POLLIN, 0});
    ::poll(polled.data(), polled.size(), 100);
    for (std::size_t i = 0; i < polled.size(); ++i) {
      if (polled[i].revents == 0) continue;
      int r = 0;
      while ((r = sd_bus_process(connections_[i].get(), nullptr)) > 0) {
      }
      if (r < 0) ::_exit(0);  // the daemon has left
    }
  }

  Board& board_;
  std::vector<ipc::BusPtr> connections_;
  Steady::time_point start_;
  int waiting_ = 0;
};

class LeavingTest : public testing::Test {
 protected:
  LeavingTest()
      : board_(new (::mmap(nullptr, sizeof(Board), PROT_READ | PROT_WRITE,
                           MAP_SHARED | MAP_ANONYMOUS, -1, 0)) Board) {
    sockaddr_in address{
        .sin_family = AF_INET, .sin_port = 0, .sin_addr = {htonl(INADDR_LOOPBACK)}, .sin_zero = {}};
    socklen_t size = sizeof address;
    ::bind(service_, reinterpret_cast<sockaddr*>(&address), size);
    ::listen(service_, 16);
    ::getsockname(service_, reinterpret_cast<sockaddr*>(&address), &size);
    root_.write(
        "XDG_CONFIG_DIRS/com.quenta.zelkord/defaults.json",
        fmt::format(R"({{"ZLKBagURL": "https://127.0.0.1:{}/bag"}})", ntohs(address.sin_port)));
  }
  void TearDown() override {
    for (const pid_t asker : askers_) {
      ::kill(asker, SIGKILL);
      ::waitpid(asker, nullptr, 0);
    }
    ::close(service_);
    ::munmap(board_, sizeof(Board));
  }

  template <typename Condition>
  static bool eventually(Condition condition) {
    const auto deadline = Steady::now() + kPatience;
    while (!condition() && Steady::now() < deadline) ::usleep(1000);
    return condition();
  }
  void start() {
    daemon_.emplace(root_);
    ASSERT_TRUE(eventually([&] { return connectTo(DaemonProcess::socketOf(root_)) != nullptr; }));
  }
  void startClients() {
    for (int i = 0; i < kClientProcesses; ++i) {
      askers_.push_back(::fork());
      if (askers_.back() == 0) Asker(DaemonProcess::socketOf(root_), *board_).askForEver();
    }
    ASSERT_TRUE(eventually([&] { return board_->ready == kAll; })) << board_->ready;
  }
  void ask() {
    board_->asked = 0;
    board_->answered = 0;
    ++board_->round;
    ASSERT_TRUE(eventually([&] { return board_->asked == kAll; })) << board_->asked;
  }

  const TemporaryDirectory root_;
  // Takes connections and never says anything.
  const int service_ = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  Board* const board_;
  std::vector<pid_t> askers_;
  std::optional<DaemonProcess> daemon_;
};

TEST_F(LeavingTest, NineHundredClientsThatWaitForABagDelayNeitherOthersNorTheEnd) {
  ASSERT_NO_FATAL_FAILURE(start());
  ASSERT_NO_FATAL_FAILURE(startClients());
  ASSERT_NO_FATAL_FAILURE(ask());
  const auto begin = Steady::now();
  const auto newcomer = connectTo(DaemonProcess::socketOf(root_));
  EXPECT_TRUE(call(newcomer.get(), "com.quenta.zelkord.Diagnostics1", "Status", ""));
  EXPECT_TRUE(configure(newcomer.get()));
  EXPECT_LT(millisecondsSince(begin), 1000 * kSlowness);
  EXPECT_TRUE(eventually([&] { return board_->answered == kAll; })) << board_->answered;
  EXPECT_LT(board_->slowest, 1900 * kSlowness);
  RecordProperty("slowest_ms", board_->slowest);

  ASSERT_NO_FATAL_FAILURE(ask());
  const auto end = Steady::now();
  daemon_->send(SIGTERM);
  EXPECT_EQ(daemon_->waitForEnd(kPatience), 0);
  EXPECT_LT(millisecondsSince(end), 2000 * kSlowness);
}

TEST_F(LeavingTest, LockedDatabasesDelayNeitherClientsNorTheEnd) {
  ASSERT_NO_FATAL_FAILURE(start());
  const auto client = connectTo(DaemonProcess::socketOf(root_));
  ASSERT_TRUE(configure(client.get()));
  std::vector<sqlite3*> holders(2);
  const char* const names[] = {"defaults.db", "counters.db"};
  for (std::size_t i = 0; i < holders.size(); ++i) {
    const auto path = DaemonProcess::stateOf(root_) + "/" + names[i];
    ASSERT_EQ(sqlite3_open(path.c_str(), &holders[i]), SQLITE_OK);
    sqlite3_busy_timeout(holders[i], 10'000);  // the daemon may be writing
    ASSERT_EQ(sqlite3_exec(holders[i], "BEGIN EXCLUSIVE", nullptr, nullptr, nullptr), SQLITE_OK);
  }
  std::vector<ipc::BusPtr> writers;
  for (int i = 0; i < 4; ++i) {
    writers.push_back(connectTo(DaemonProcess::socketOf(root_)));
    sd_bus_call_method_async(writers.back().get(), nullptr, "com.quenta.zelkord",
                             "/com/quenta/zelkord", "com.quenta.zelkord.Diagnostics1",
                             "WriteDefault", nullptr, nullptr, "sss", "", "ZLKNoParallax", "1");
    sd_bus_flush(writers.back().get());
  }
  const auto begin = Steady::now();
  for (int i = 0; i < 10; ++i) {
    const auto newcomer = connectTo(DaemonProcess::socketOf(root_));
    EXPECT_TRUE(configure(newcomer.get()));
    EXPECT_TRUE(call(newcomer.get(), "com.quenta.zelkord.Daemon1", "Request", "sa{sv}",
                     "flightSearch", 1, "queryId", "x", std::int64_t{1}));
  }
  EXPECT_LT(millisecondsSince(begin), 900 * kSlowness);
  const auto end = Steady::now();
  daemon_->send(SIGTERM);
  EXPECT_EQ(daemon_->waitForEnd(kPatience), 0);
  EXPECT_LT(millisecondsSince(end), 2000 * kSlowness);
  for (auto* holder : holders) sqlite3_close_v2(holder);
}

TEST_F(LeavingTest, ASignalDuringTheStartIsHeardAtItsEnd) {
  for (const int signal : {SIGTERM, SIGINT}) {
    DaemonProcess daemon(root_, [signal] { ::raise(signal); });
    EXPECT_EQ(daemon.waitForEnd(kPatience), 0) << signal;
  }
}

}  // namespace
}  // namespace zelkord
