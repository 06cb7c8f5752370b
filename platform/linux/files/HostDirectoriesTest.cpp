#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <map>

#include "platform/linux/files/HostDirectories.h"
#include "platform/linux/files/StateLock.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;

using EnvironmentVariables = std::map<std::string, std::string>;

DirectoryEnvironment environmentOf(const EnvironmentVariables& variables,
                                   const std::string& runtimeRoot = "/nowhere") {
  DirectoryEnvironment environment;
  environment.environment = [variables](const std::string& name) -> std::optional<std::string> {
    const auto found = variables.find(name);
    return found == variables.end() ? std::nullopt : std::optional(found->second);
  };
  environment.user = ::getuid();
  environment.home = "/home/account";
  environment.runtimeRoot = runtimeRoot;
  return environment;
}

TEST(HostDirectoriesTest, FollowTheBaseDirectoryRules) {
  struct Case {
    EnvironmentVariables variables;
    std::string caches;
    std::string state;
  };
  const std::string folder = "/com.quenta.zelkord";
  const Case cases[] = {
      {{{"XDG_CACHE_HOME", "/c"}, {"XDG_STATE_HOME", "/s/"}}, "/c", "/s"},
      {{{"HOME", "/home/me"}}, "/home/me/.cache", "/home/me/.local/state"},
      {{{"HOME", "/home/me"}, {"XDG_CACHE_HOME", "c"}, {"XDG_STATE_HOME", ""}},
       "/home/me/.cache",
       "/home/me/.local/state"},
      {{}, "/home/account/.cache", "/home/account/.local/state"},
      {{{"HOME", "/"}}, "/.cache", "/.local/state"},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.caches);
    auto variables = test.variables;
    variables["XDG_RUNTIME_DIR"] = "/r";
    const auto directories = hostDirectories(environmentOf(variables));
    EXPECT_EQ(directories.caches, test.caches + folder);
    EXPECT_EQ(directories.state, test.state + folder);
    EXPECT_EQ(directories.runtime, "/r" + folder);
  }
}

TEST(HostDirectoriesTest, FindAPrivateRuntimeDirectory) {
  const TemporaryDirectory root;
  const auto own = root / ("run/" + std::to_string(::getuid()));
  const auto temporary = root / ("zelkord-" + std::to_string(::getuid()));
  const auto environment = environmentOf({{"TMPDIR", root.path()}}, root / "run");

  EXPECT_EQ(hostDirectories(environment).runtime, temporary + "/com.quenta.zelkord");
  struct stat status {};
  ASSERT_EQ(::stat(temporary.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0700u);

  // Somebody prepared the name for us to fall into.
  ::chmod(temporary.c_str(), 0777);
  const auto fresh = hostDirectories(environment).runtime;
  EXPECT_THAT(fresh, StartsWith(temporary + "."));

  std::filesystem::create_directories(own);
  EXPECT_EQ(hostDirectories(environment).runtime, own + "/com.quenta.zelkord");
}

TEST(HostDirectoriesTest, ListConfigurationMostImportantFirst) {
  const auto given = hostConfigurationDirectories(
      environmentOf({{"XDG_CONFIG_HOME", "/u"}, {"XDG_CONFIG_DIRS", "/a:relative::/b/"}}));
  EXPECT_EQ(given.user, "/u/com.quenta.zelkord");
  EXPECT_THAT(given.system, ElementsAre("/a/com.quenta.zelkord", "/b/com.quenta.zelkord"));
  EXPECT_THAT(hostConfigurationDirectories(environmentOf({})).system,
              ElementsAre("/etc/xdg/com.quenta.zelkord"));
  EXPECT_THAT(hostConfigurationDirectories(environmentOf({{"XDG_CONFIG_DIRS", "x"}})).system,
              IsEmpty());
}

TEST(StateLockTest, HasOneHolder) {
  const TemporaryDirectory root;
  Error error;
  auto first = StateLock::acquire(root.path(), &error);
  ASSERT_TRUE(first);
  EXPECT_FALSE(StateLock::acquire(root.path(), &error));
  EXPECT_EQ(error.code, EWOULDBLOCK);
  EXPECT_EQ(error.reason(),
            "already running: process " + std::to_string(::getpid()) + " uses " + root.path());
  first.reset();
  EXPECT_TRUE(StateLock::acquire(root.path(), &error));
  EXPECT_FALSE(StateLock::acquire(root / "missing", &error));
  EXPECT_EQ(error.code, ENOENT);
}

}  // namespace
}  // namespace zelkord
