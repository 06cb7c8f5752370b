#include <fcntl.h>
#include <gmock/gmock.h>
#include <poll.h>
#include <pty.h>
#include <signal.h>
#include <spawn.h>
#include <sys/ioctl.h>
#include <sys/wait.h>
#include <termios.h>

#include <chrono>
#include <functional>

#include "corezelkor/client/TinyDaemonTestSupport.h"
#include "zelkorctl/Printable.h"

namespace zelkorctl {
namespace {

using testing::EndsWith;
using testing::HasSubstr;
using zelkor::TinyDaemon;

constexpr std::chrono::seconds kPatience(20);
constexpr const char* kEnter = "\033[?1049h";
constexpr const char* kLeave = "\033[?1049l";

// `zelkorctl type` as a process of its own, at the far end of a pseudo-terminal.
class TypingProcess {
 public:
  TypingProcess(const std::string& socket, const winsize& size) {
    char name[64];
    int far = -1;
    EXPECT_EQ(::openpty(&near_, &far, name, nullptr, &size), 0);
    ::tcgetattr(near_, &before_);
    posix_spawn_file_actions_t files;
    posix_spawn_file_actions_init(&files);
    // Opened first thing in a session of its own, it is the terminal that rules the process.
    posix_spawn_file_actions_addopen(&files, 0, name, O_RDWR, 0);
    posix_spawn_file_actions_adddup2(&files, 0, 1);
    posix_spawn_file_actions_adddup2(&files, 0, 2);
    _spawn(socket, &files);
    posix_spawn_file_actions_destroy(&files);
    ::close(far);
  }
  // With standard input closed, writing to nowhere.
  explicit TypingProcess(const std::string& socket) {
    posix_spawn_file_actions_t files;
    posix_spawn_file_actions_init(&files);
    posix_spawn_file_actions_addclose(&files, 0);
    posix_spawn_file_actions_addopen(&files, 1, "/dev/null", O_WRONLY, 0);
    _spawn(socket, &files);
    posix_spawn_file_actions_destroy(&files);
  }
  ~TypingProcess() {
    if (process_ > 0) {
      ::kill(process_, SIGKILL);
      ::waitpid(process_, nullptr, 0);
    }
    if (near_ >= 0) ::close(near_);
  }
  TypingProcess(const TypingProcess&) = delete;
  TypingProcess& operator=(const TypingProcess&) = delete;

  void type(std::string_view keys) const {
    EXPECT_EQ(::write(near_, keys.data(), keys.size()), static_cast<ssize_t>(keys.size()));
  }
  void resize(const winsize& size) const { ::ioctl(near_, TIOCSWINSZ, &size); }
  void send(int signal) const { ::kill(process_, signal); }

  // Reads until the screen says so; everything that was read so far.
  const std::string& readUntil(const std::function<bool(const std::string&)>& enough) {
    const auto deadline = std::chrono::steady_clock::now() + kPatience;
    while (!enough(read_) && std::chrono::steady_clock::now() < deadline) _readMore(100);
    EXPECT_TRUE(enough(read_)) << printable(read_);
    return read_;
  }
  const std::string& readUntil(const std::string& text) {
    return readUntil([&](const std::string& read) { return read.find(text) != std::string::npos; });
  }

  // The status as waitpid gives it; -1 when it does not end.
  int waitForEnd() {
    const auto deadline = std::chrono::steady_clock::now() + kPatience;
    int status = 0;
    while (::waitpid(process_, &status, WNOHANG) == 0) {
      if (std::chrono::steady_clock::now() > deadline) return -1;
      _readMore(20);
    }
    process_ = -1;
    _readMore(20);
    return status;
  }
  const std::string& read() const { return read_; }
  bool terminalIsAsBefore() const {
    termios now{};
    ::tcgetattr(near_, &now);
    return now.c_lflag == before_.c_lflag && now.c_iflag == before_.c_iflag;
  }

 private:
  void _spawn(const std::string& socket, posix_spawn_file_actions_t* files) {
    posix_spawnattr_t attributes;
    posix_spawnattr_init(&attributes);
    posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSID);
    std::string words[] = {"zelkorctl", "type", "--socket", socket};
    char* arguments[] = {words[0].data(), words[1].data(), words[2].data(), words[3].data(),
                         nullptr};
    EXPECT_EQ(::posix_spawn(&process_, ZK_ZELKORCTL_BINARY, files, &attributes, arguments, environ),
              0);
    posix_spawnattr_destroy(&attributes);
  }

  void _readMore(int milliseconds) {
    pollfd waiting{near_, POLLIN, 0};
    if (::poll(&waiting, 1, milliseconds) <= 0) return;
    char bytes[4096];
    const auto count = ::read(near_, bytes, sizeof bytes);
    if (count > 0) read_.append(bytes, static_cast<std::size_t>(count));
  }

  int near_ = -1;
  pid_t process_ = -1;
  termios before_{};
  std::string read_;
};

// The lines of the screen that was drawn last, without what steers the terminal.
std::vector<std::string> lastScreen(const std::string& read) {
  const auto begin = read.rfind("\033[H");
  const auto end = read.find("\033[J", begin);
  std::vector<std::string> lines = {""};
  for (auto at = begin + 3; at < end && end != std::string::npos; ++at) {
    if (read.compare(at, 3, "\033[K") == 0) {
      at += 2;
    } else if (read[at] == '\n') {
      lines.emplace_back();
    } else if (read[at] != '\r') {
      lines.back() += read[at];
    }
  }
  return lines;
}

class TypeTest : public testing::Test {
 protected:
  TypeTest() {
    daemon_.on("Configure", [this](sd_bus_message* call) {
      sd_bus_reply_method_return(call, "s", daemon_.address().c_str());
    });
    daemon_.on("Request", [](sd_bus_message* call) {
      const std::string_view body =
          R"([{"results":[{"title":"First","description":"a rather long description of it"},)"
          R"({"title":"Second"},{"title":"Third"}]}])";
      sd_bus_message* reply = nullptr;
      sd_bus_message_new_method_return(call, &reply);
      sd_bus_message_append(reply, "x", std::int64_t{1});
      sd_bus_message_open_container(reply, 'a', "{sv}");
      sd_bus_message_open_container(reply, 'e', "sv");
      sd_bus_message_append(reply, "s", "data");
      sd_bus_message_open_container(reply, 'v', "ay");
      sd_bus_message_append_array(reply, 'y', body.data(), body.size());
      for (int i = 0; i < 3; ++i) sd_bus_message_close_container(reply);
      sd_bus_message_append(reply, "a{sv}", 0);
      sd_bus_send(nullptr, reply, nullptr);
      sd_bus_message_unref(reply);
    });
  }

  TinyDaemon daemon_;
};

TEST_F(TypeTest, PutsTheTerminalBackBeforeASignalEndsIt) {
  for (const int signal : {SIGTERM, SIGINT, SIGHUP}) {
    SCOPED_TRACE(signal);
    TypingProcess process(daemon_.path(), {24, 80, 0, 0});
    process.type("a");
    EXPECT_THAT(process.readUntil("Third"), HasSubstr(kEnter));
    EXPECT_FALSE(process.terminalIsAsBefore());
    process.send(signal);
    const int status = process.waitForEnd();
    EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == signal) << status;
    EXPECT_THAT(process.read(), EndsWith(kLeave));
    EXPECT_TRUE(process.terminalIsAsBefore());
  }
}

TEST_F(TypeTest, EndsAtOnceWhenTheUserSaysSo) {
  daemon_.on("Request", [](sd_bus_message*) {});  // an answer that does not come
  for (const auto* key : {"\x03", "\x04"}) {
    TypingProcess process(daemon_.path(), {24, 80, 0, 0});
    process.type("a");
    process.readUntil("> a");
    process.type(key);
    EXPECT_EQ(process.waitForEnd(), 0);
    EXPECT_THAT(process.read(), EndsWith(kLeave));
  }
}

TEST_F(TypeTest, EndsWhenStandardInputIsClosed) {
  TypingProcess process(daemon_.path());
  const int status = process.waitForEnd();
  EXPECT_TRUE(WIFEXITED(status)) << status;
}

TEST_F(TypeTest, FitsTheTerminalWhateverItsSize) {
  TypingProcess process(daemon_.path(), {24, 80, 0, 0});
  process.type("a");  // one query, one answer: no other is drawn later
  process.readUntil("Third");
  const struct {
    unsigned short rows;
    unsigned short columns;
    std::size_t shown;  // lines: what is typed, the outcome, three results
  } sizes[] = {{3, 30, 3}, {24, 40, 5}, {1, 20, 1}, {24, 4, 5}, {24, 80, 5}};
  for (const auto& [rows, columns, shown] : sizes) {
    SCOPED_TRACE(std::to_string(rows) + " x " + std::to_string(columns));
    const auto before = process.read().size();
    process.resize({rows, columns, 0, 0});
    process.readUntil([&](const std::string& read) {
      const auto begin = read.find("\033[H", before);
      return begin != std::string::npos && read.find("\033[J", begin) != std::string::npos;
    });
    const auto lines = lastScreen(process.read());
    EXPECT_EQ(lines.size(), shown);
    for (const auto& line : lines) EXPECT_LT(displayWidth(line), columns) << line;
    EXPECT_THAT(lines.front(), testing::StartsWith(">"));
  }
}

}  // namespace
}  // namespace zelkorctl
