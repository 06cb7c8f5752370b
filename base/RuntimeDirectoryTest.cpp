#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <map>

#include "base/RuntimeDirectory.h"

namespace zelkor {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class RuntimeDirectoryTest : public testing::Test {
 protected:
  RuntimeDirectoryTest() {
    char folder[] = "/tmp/runtime.XXXXXX";
    root_ = ::mkdtemp(folder);
    usual_ = root_ + "/zelkord-" + std::to_string(::getuid());
    variables_["TMPDIR"] = root_;
  }
  ~RuntimeDirectoryTest() override { std::filesystem::remove_all(root_); }

  RuntimeEnvironment environment() const {
    return {[this](const std::string& name) -> std::optional<std::string> {
              const auto found = variables_.find(name);
              return found == variables_.end() ? std::nullopt : std::optional(found->second);
            },
            ::getuid(), root_ + "/run"};
  }

  std::string root_;
  std::string usual_;
  std::map<std::string, std::string> variables_;
};

TEST_F(RuntimeDirectoryTest, IsFoundOnlyWhereNobodyElseCanServe) {
  EXPECT_THAT(findRuntimeDirectories(environment()), IsEmpty());
  std::filesystem::create_directory(root_ + "/private");
  ::chmod((root_ + "/private").c_str(), 0700);
  // Names that somebody may have taken: a link, a file, a directory that others may enter.
  std::filesystem::create_symlink(root_ + "/private", usual_);
  std::filesystem::create_symlink("/etc/passwd", usual_ + ".file");
  ::mkdir((usual_ + ".open").c_str(), 0700);
  ::chmod((usual_ + ".open").c_str(), 0711);
  // Of another user with a longer number.
  ::mkdir((usual_ + "7").c_str(), 0700);
  EXPECT_THAT(findRuntimeDirectories(environment()), IsEmpty());

  auto stranger = environment();
  ::mkdir((usual_ + ".b").c_str(), 0700);
  stranger.user = ::getuid() + 1;
  EXPECT_THAT(findRuntimeDirectories(stranger), IsEmpty());
  EXPECT_THAT(findRuntimeDirectories(environment()), ElementsAre(usual_ + ".b"));
}

TEST_F(RuntimeDirectoryTest, IsTheOneThatTheDaemonMade) {
  std::filesystem::create_symlink(root_, usual_);
  const auto made = makeRuntimeDirectory(environment());
  EXPECT_THAT(findRuntimeDirectories(environment()), ElementsAre(made));
  EXPECT_EQ(makeRuntimeDirectory(environment()), made);  // the next start makes no second one
  // The usual name is free again: an older daemon is still found behind it.
  std::filesystem::remove(usual_);
  EXPECT_EQ(makeRuntimeDirectory(environment()), usual_);
  EXPECT_THAT(findRuntimeDirectories(environment()), ElementsAre(usual_, made));
  // What the host names counts alone.
  const auto user = root_ + "/run/" + std::to_string(::getuid());
  std::filesystem::create_directories(user);
  EXPECT_THAT(findRuntimeDirectories(environment()), ElementsAre(user));
  variables_["XDG_RUNTIME_DIR"] = "/given/";
  EXPECT_THAT(findRuntimeDirectories(environment()), ElementsAre("/given"));
  variables_["XDG_RUNTIME_DIR"] = "relative";
  EXPECT_THAT(findRuntimeDirectories(environment()), ElementsAre(user));
}

}  // namespace
}  // namespace zelkor
