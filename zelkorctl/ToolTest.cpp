#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <sstream>

#include "corezelkor/client/TinyDaemonTestSupport.h"
#include "zelkorctl/SettingsFile.h"
#include "zelkorctl/Tool.h"

namespace zelkorctl {
namespace {

using testing::HasSubstr;
using zelkor::TinyDaemon;

// Answers a search with its own query identifier and text; "slow" never, "bad" with an error.
void answerSearch(sd_bus_message* call) {
  std::int64_t queryId = 0;
  std::string text;
  sd_bus_message_skip(call, "s");
  sd_bus_message_enter_container(call, 'a', "{sv}");
  while (sd_bus_message_enter_container(call, 'e', "sv") > 0) {
    const char* key = nullptr;
    const char* value = nullptr;
    sd_bus_message_read(call, "s", &key);
    if (std::string(key) == "queryId") {
      sd_bus_message_read(call, "v", "x", &queryId);
    } else if (std::string(key) == "queryString") {
      sd_bus_message_read(call, "v", "s", &value);
      text = value;
    } else {
      sd_bus_message_skip(call, "v");
    }
    sd_bus_message_exit_container(call);
  }
  if (text == "slow") return;
  if (text == "bad") {
    sd_bus_reply_method_return(call, "xa{sv}a{sv}", queryId, 0, 2, "domain", "s", "D\x1b", "code",
                               "x", std::int64_t{5});
    return;
  }
  const char body[] = R"([{"results":[{"title":"T","description":"d"}]}])";
  sd_bus_message* reply = nullptr;
  sd_bus_message_new_method_return(call, &reply);
  sd_bus_message_append(reply, "x", queryId);
  sd_bus_message_open_container(reply, 'a', "{sv}");
  sd_bus_message_open_container(reply, 'e', "sv");
  sd_bus_message_append(reply, "s", "data");
  sd_bus_message_open_container(reply, 'v', "ay");
  sd_bus_message_append_array(reply, 'y', body, sizeof body - 1);
  for (int i = 0; i < 3; ++i) sd_bus_message_close_container(reply);
  sd_bus_message_append(reply, "a{sv}", 0);
  sd_bus_send(nullptr, reply, nullptr);
  sd_bus_message_unref(reply);
}

class ToolTest : public testing::Test {
 protected:
  ToolTest() {
    daemon_.reply("Configure", "s", "unix:path=/nowhere");
    daemon_.on("Request", answerSearch);
  }

  int run(std::vector<std::string> arguments, int input = -1) {
    arguments.insert(arguments.begin(), {"--socket", daemon_.path()});
    return runRaw(arguments, input);
  }
  int runRaw(const std::vector<std::string>& arguments, int input = -1) {
    out_.str("");
    err_.str("");
    return runTool(arguments, {.out = out_, .err = err_, .input = input});
  }

  TinyDaemon daemon_;
  std::ostringstream out_;
  std::ostringstream err_;
};

TEST_F(ToolTest, ExitStatusesSayWhatHappened) {
  EXPECT_EQ(run({"search", "hello"}), kAnswered) << err_.str();
  EXPECT_THAT(out_.str(), HasSubstr("  T    d\n"));
  EXPECT_EQ(run({"search", "bad"}), kErrorReply);
  EXPECT_THAT(out_.str(), HasSubstr("D\\x1b 5"));
  EXPECT_EQ(run({"search", "slow", "--timeout", "0.01"}), kErrorReply);
  EXPECT_THAT(out_.str(), HasSubstr("dropped"));
  EXPECT_EQ(run({"search"}), kWrongUsage);
  EXPECT_EQ(runRaw({"search", "a", "--socket", "/nowhere"}), kNotReachable);
  EXPECT_EQ(runRaw({"metrics", "--json", "--socket", "/nowhere"}), kNotReachable);
  EXPECT_THAT(out_.str(), HasSubstr("\"error\""));
  for (const auto* command :
       {"search", "type", "bag", "defaults", "sessions", "metrics", "status"}) {
    EXPECT_EQ(runRaw({"help", command}), kAnswered);
    EXPECT_THAT(out_.str(), HasSubstr(std::string("usage: zelkorctl ") + command));
  }
}

TEST_F(ToolTest, TypesEveryPrefixInOrder) {
  EXPECT_EQ(run({"search", "aö", "--as-typed", "--delay-per-key=0", "--json"}), kAnswered);
  const auto text = out_.str();
  EXPECT_THAT(text, HasSubstr("\"queryId\":1,\"query\":\"a\""));
  EXPECT_THAT(text, HasSubstr("\"queryId\":2,\"query\":\"aö\""));
  EXPECT_LT(text.find("\"queryId\":1"), text.find("\"queryId\":2"));
}

TEST_F(ToolTest, TakesPipedCharactersAsKeystrokes) {
  int ends[2];
  ASSERT_EQ(::pipe(ends), 0);
  ASSERT_EQ(::write(ends[1], "ab\nc", 4), 4);
  ::close(ends[1]);
  EXPECT_EQ(run({"type", "--delay-per-key", "0"}, ends[0]), kAnswered);
  ::close(ends[0]);
  for (const auto* line : {"\"a\"", "\"ab\"", "\"c\""}) EXPECT_THAT(out_.str(), HasSubstr(line));
}

TEST_F(ToolTest, ShowsWhatTheDaemonSaysAligned) {
  daemon_.reply("ListSessions", "aa{ss}", 1, 2, "identifier", "lanthe", "agent", "A\n");
  EXPECT_EQ(run({"sessions"}), kAnswered);
  EXPECT_EQ(out_.str(), "lanthe  A\\n\n");
  daemon_.reply("Metrics", "a{sx}", 2, "a", std::int64_t{1}, "long", std::int64_t{2});
  EXPECT_EQ(run({"metrics"}), kAnswered);
  EXPECT_EQ(out_.str(), "a     1\nlong  2\n");
  daemon_.reply("Status", "s", R"({"pid":7,"version":"1"})");
  EXPECT_EQ(run({"status"}), kAnswered);
  EXPECT_EQ(out_.str(), "pid      7\nversion  1\n");
  daemon_.reply("Status", "s", "[");
  EXPECT_EQ(run({"status"}), kErrorReply);
  daemon_.reply("Bag", "a{sv}a{sv}", 2, "version", "s", "3", "rawBag", "s", "{\"k\":[1]}", 0);
  EXPECT_EQ(run({"bag", "--json"}), kAnswered);
  EXPECT_EQ(out_.str(),
            "{\"enabled\":true,\"feedbackEnabled\":false,\"version\":\"3\",\"bag\":{\"k\":[1]}}\n");
}

TEST_F(ToolTest, ReadsAndWritesSettingsThroughTheDaemon) {
  daemon_.reply("ReadDefault", "s", "true");
  daemon_.reply("WriteDefault", "");
  EXPECT_EQ(run({"defaults", "read", "ZLKUseMorvane"}), kAnswered);
  EXPECT_EQ(out_.str(), "true\n");
  EXPECT_EQ(run({"defaults", "write", "ZLKBagURL", "\"https://a/\""}), kAnswered);
  EXPECT_EQ(run({"defaults", "write", "ZLKBagURL", "https://a/"}), kWrongUsage);
  daemon_.reply("ReadDefault", "s", R"({"a":"x","long":[1]})");
  EXPECT_EQ(run({"defaults", "list"}), kAnswered);
  EXPECT_EQ(out_.str(), "a     \"x\"\nlong  [1]\n");
  daemon_.reply("ReadDefault", "s", "");
  EXPECT_EQ(run({"defaults", "list"}), kErrorReply);
  EXPECT_EQ(run({"defaults", "read", "ZLKUseMorvane"}), kErrorReply);
}

TEST_F(ToolTest, KeepsSettingsInAFileWhileNoDaemonRuns) {
  const auto path = daemon_.path() + ".d/state/defaults.db";
  {
    SettingsFile file(path);
    file.write("d", "b", "1");
    file.write("d", "a", "[2]");
    file.write("d", "b", "3");
    file.write("e", "b", "4");
    ASSERT_FALSE(file.error());
  }
  SettingsFile file(path);
  EXPECT_EQ(file.read("d", "b"), "3");
  file.remove("e", "b");
  EXPECT_EQ(file.read("e", "b"), std::nullopt);
  EXPECT_EQ(file.list("d"),
            (std::vector<std::pair<std::string, std::string>>{{"a", "[2]"}, {"b", "3"}}));
  EXPECT_TRUE(SettingsFile("/proc/nowhere/defaults.db").error());
  std::filesystem::remove_all(daemon_.path() + ".d");
}

}  // namespace
}  // namespace zelkorctl
