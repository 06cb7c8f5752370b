#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <map>
#include <sstream>

#include "corezelkor/client/TinyDaemonTestSupport.h"
#include "zelkorctl/SettingsFile.h"
#include "zelkorctl/Tool.h"

namespace zelkorctl {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using zelkor::TinyDaemon;

// What a request asks for.
struct Asked {
  std::string kind;
  std::int64_t queryId = 0;
  std::map<std::string, std::string> texts;
  bool verbose = false;
};

Asked readCall(sd_bus_message* call) {
  Asked asked;
  const char* text = nullptr;
  sd_bus_message_read(call, "s", &text);
  asked.kind = text;
  sd_bus_message_enter_container(call, 'a', "{sv}");
  while (sd_bus_message_enter_container(call, 'e', "sv") > 0) {
    const char* key = nullptr;
    const char* type = nullptr;
    int flag = 0;
    sd_bus_message_read(call, "s", &key);
    sd_bus_message_peek_type(call, nullptr, &type);
    if (std::string(key) == "queryId") {
      sd_bus_message_read(call, "v", "x", &asked.queryId);
    } else if (std::string(key) == "verboseReply") {
      sd_bus_message_read(call, "v", "b", &flag);
      asked.verbose = flag != 0;
    } else if (std::string(type) == "s") {
      sd_bus_message_read(call, "v", "s", &text);
      asked.texts[key] = text;
    } else {
      sd_bus_message_skip(call, "v");
    }
    sd_bus_message_exit_container(call);
  }
  return asked;
}

// Answers with a body; with `status`, as one that came from the service.
void answerWith(sd_bus_message* call, std::int64_t queryId, std::string_view body, int status) {
  sd_bus_message* reply = nullptr;
  sd_bus_message_new_method_return(call, &reply);
  sd_bus_message_append(reply, "x", queryId);
  sd_bus_message_open_container(reply, 'a', "{sv}");
  if (status != 0) {
    sd_bus_message_append(reply, "{sv}", "httpResponse", "a{sv}", 1, "status", "i", status);
  }
  sd_bus_message_open_container(reply, 'e', "sv");
  sd_bus_message_append(reply, "s", "data");
  sd_bus_message_open_container(reply, 'v', "ay");
  sd_bus_message_append_array(reply, 'y', body.data(), body.size());
  for (int i = 0; i < 3; ++i) sd_bus_message_close_container(reply);
  sd_bus_message_append(reply, "a{sv}", 0);
  sd_bus_send(nullptr, reply, nullptr);
  sd_bus_message_unref(reply);
}

// Answers with the query's own identifier; "slow" never, "bad" with an error, "kept" as if from a
// cache. A search leads on to further results, cards and images.
void answerSearch(sd_bus_message* call) {
  auto asked = readCall(call);
  const auto text = asked.texts["queryString"];
  if (text == "slow") return;
  if (text == "bad") {
    sd_bus_reply_method_return(call, "xa{sv}a{sv}", asked.queryId, 0, 2, "domain", "s", "D\x1b",
                               "code", "x", std::int64_t{5});
    return;
  }
  std::string body = R"([{"more_results_url":"m1","results":[{"title":"T","description":"d",)"
                     R"("card_url":"c1","icon":{"url":"https://a/fr.png"}},)"
                     R"({"card_url":"c2","icon":{"id":"word"}}]}])";
  if (text == "plain") body = R"([{"results":[{"title":"T"}]}])";
  if (asked.kind == "moreResults") {
    const auto url = asked.texts["moreResultsURL"];
    body = url == "m1" ? R"([{"more_results_url":"m2","results":[{"title":"page 1"}]}])"
                       : R"([{"results":[{"title":"last )" + url + R"("}]}])";
  }
  if (asked.kind == "card") body = R"([{"title":"card )" + asked.texts["cardURL"] + R"("}])";
  if (asked.kind == "lookup") {
    body = R"([{"results":[{"title":"in )" + asked.texts["queryContext"] + R"("}]}])";
  }
  if (asked.kind == "zeroKeyword") body = R"([{"results":[{"title":"popular"}]}])";
  answerWith(call, asked.queryId, body, text == "kept" || !asked.verbose ? 0 : 200);
}

class ToolTest : public testing::Test {
 protected:
  ToolTest() {
    daemon_.on("Configure", [this](sd_bus_message* call) {
      sd_bus_reply_method_return(call, "s", daemon_.address().c_str());
    });
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

  std::size_t requests() {
    const auto calls = daemon_.calls();
    return static_cast<std::size_t>(std::count(calls.begin(), calls.end(), "Request"));
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
  for (const auto* command : {"search", "type", "more", "card", "lookup", "zkw", "images", "bag",
                              "defaults", "sessions", "metrics", "status"}) {
    EXPECT_EQ(runRaw({"help", command}), kAnswered);
    EXPECT_THAT(out_.str(), HasSubstr(std::string("usage: zelkorctl ") + command));
  }
}

TEST_F(ToolTest, TellsCacheAndNetworkApart) {
  EXPECT_EQ(run({"search", "hello", "--json"}), kAnswered);
  EXPECT_THAT(out_.str(), HasSubstr("\"source\":\"network\""));
  EXPECT_THAT(out_.str(), Not(HasSubstr("httpResponse")));
  EXPECT_EQ(run({"search", "hello", "--json", "--verbose"}), kAnswered);
  EXPECT_THAT(out_.str(), HasSubstr("httpResponse"));
  EXPECT_EQ(run({"search", "kept"}), kAnswered);
  EXPECT_THAT(out_.str(), HasSubstr("answered cache"));
}

TEST_F(ToolTest, FollowsAnAnswerToFurtherResultsAndCards) {
  const struct {
    std::vector<std::string> words;
    int status;
    const char* shown;
    std::size_t calls;  // of Request
  } cases[] = {
      {{"more", "snow"}, kAnswered, "\n  page 1\n", 2},
      {{"more", "snow", "--pages", "9"}, kAnswered, "\n  last m2\n", 3},
      {{"more", "--url", "u", "--endpoint"}, kAnswered, "\n  last u\n", 1},
      {{"more", "plain", "--json"}, kErrorReply, "the results name no further ones", 1},
      {{"more", "bad"}, kErrorReply, "D\\x1b 5", 1},
      {{"card", "snow", "--result", "2"}, kAnswered, "\n  card c2\n", 2},
      {{"card", "snow", "--result", "3", "--json"}, kErrorReply, "result 3 has no card", 1},
      {{"card", "--url", "u"}, kAnswered, "\n  card u\n", 1},
      {{"lookup", "bank", "--context", "the river"}, kAnswered, "\n  in the river\n", 1},
      {{"lookup", "bank"}, kAnswered, "\n  in bank\n", 1},
      {{"zkw"}, kAnswered, "\n  popular\n", 1},
  };
  for (const auto& [words, status, shown, calls] : cases) {
    SCOPED_TRACE(shown);
    const auto before = requests();
    EXPECT_EQ(run(words), status) << err_.str();
    EXPECT_THAT(out_.str(), HasSubstr(shown));
    EXPECT_EQ(requests() - before, calls);
  }
}

TEST_F(ToolTest, LoadsTheImagesOfAnAnswer) {
  daemon_.on("LoadImages", [](sd_bus_message* call) {
    const char png[] = "\x89PNG\r\n\x1a\n";
    sd_bus_message* reply = nullptr;
    sd_bus_message_new_method_return(call, &reply);
    sd_bus_message_open_container(reply, 'a', "{say}");
    for (const auto* key : {"https://a/fr.png", "other"}) {
      sd_bus_message_open_container(reply, 'e', "say");
      sd_bus_message_append(reply, "s", key);
      sd_bus_message_append_array(reply, 'y', png, sizeof png - 1);
      sd_bus_message_close_container(reply);
    }
    sd_bus_message_close_container(reply);
    sd_bus_send(nullptr, reply, nullptr);
    sd_bus_message_unref(reply);
  });
  const auto folder = daemon_.path() + ".d";
  EXPECT_EQ(run({"images", "snow", "--save", folder, "--json"}), kErrorReply);
  EXPECT_THAT(out_.str(), HasSubstr(R"("images":[{"key":"https://a/fr.png","bytes":8,)"
                                    R"("type":"image/png","file":")" +
                                    folder + R"(/fr.png"}],"missing":["word"])"));
  EXPECT_EQ(std::filesystem::file_size(folder + "/fr.png"), 8u);
  std::filesystem::remove_all(folder);
  EXPECT_EQ(run({"images", "--url", "https://a/fr.png"}), kAnswered);
  EXPECT_THAT(out_.str(), HasSubstr("8 bytes, image/png\n"));
  EXPECT_EQ(run({"images", "bad"}), kErrorReply);
  EXPECT_EQ(runRaw({"images", "--id", "a", "--socket", "/nowhere"}), kNotReachable);
}

TEST_F(ToolTest, SaysThatTheOutputCouldNotBeWritten) {
  for (const auto& words : {std::vector<std::string>{"search", "hello"}, {"help"}, {"--version"}}) {
    std::ofstream full("/dev/full");
    err_.str("");
    auto all = words;
    all.insert(all.end(), {"--socket", daemon_.path()});
    EXPECT_EQ(runTool(all, {.out = full, .err = err_, .input = -1}), kErrorReply);
    EXPECT_THAT(err_.str(), HasSubstr("the output could not be written"));
  }
}

TEST_F(ToolTest, SaysWhyThereIsNoBag) {
  const auto noBag = [](sd_bus_message* call) {
    const auto asked = readCall(call);
    const auto* reason = asked.kind == "card" ? "no URL" : "timeout";
    sd_bus_reply_method_return(call, "xa{sv}a{sv}", asked.queryId, 0, 3, "domain", "s",
                               "ZLKErrorDomain", "code", "x", std::int64_t{1}, "userInfo", "a{sv}",
                               1, "reason", "s", reason);
  };
  daemon_.on("Request", noBag);
  daemon_.reply("Bag", "a{sv}a{sv}", 0, 3, "domain", "s", "ZLKErrorDomain", "code", "x",
                std::int64_t{1}, "userInfo", "a{sv}", 1, "reason", "s", "timeout");
  daemon_.reply("Status", "s",
                R"({"pid":7,"bag":{"url":"https://a/bag","last_failure":{"time":1000,)"
                R"("reason":"connection refused"},"next_attempt":2000}})");
  const auto* kWhy = "fetching https://a/bag failed";
  for (const auto& words : {std::vector<std::string>{"search", "a"},
                            {"search", "a", "--as-typed"},
                            {"more", "a"},
                            {"search", "a", "--kind=card"},
                            {"zkw"},
                            {"status"}}) {
    SCOPED_TRACE(testing::PrintToString(words));
    run(words);
    EXPECT_THAT(out_.str(), AllOf(HasSubstr(kWhy), HasSubstr("ago: connection refused")));
  }
  EXPECT_EQ(run({"bag"}), kErrorReply);
  EXPECT_THAT(err_.str(), HasSubstr(kWhy));
  for (const auto* command : {"search", "bag"}) {
    auto words = std::vector<std::string>{"--json", command};
    if (words.back() == "search") words.emplace_back("a");
    EXPECT_EQ(run(words), kErrorReply);
    EXPECT_THAT(out_.str(), AllOf(HasSubstr(R"("reason":"timeout"})"),
                                  HasSubstr(R"("bag":{"url":"https://a/bag")")));
  }
  // A daemon that does not tell, and one that has a bag by now.
  for (const auto* status : {"{}", R"({"bag":{"url":"u","enabled":false,"last_failure":{}}})"}) {
    daemon_.reply("Status", "s", status);
    EXPECT_EQ(run({"search", "a"}), kErrorReply);
    EXPECT_THAT(out_.str(), AllOf(HasSubstr("timeout"), Not(HasSubstr("no bag"))));
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
