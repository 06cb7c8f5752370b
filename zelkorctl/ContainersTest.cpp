#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <sstream>

#include "corezelkor/client/TinyDaemonTestSupport.h"
#include "halvane/DaemonFeedback.h"
#include "zelkorctl/ContainerFile.h"
#include "zelkorctl/FeedbackMessages.h"
#include "zelkorctl/Tool.h"

namespace zelkorctl {
namespace {

using testing::HasSubstr;

std::string framed(std::string_view payload) {
  std::string bytes;
  for (int i = 0; i < 8; ++i) bytes += static_cast<char>(payload.size() >> (8 * i) & 0xFF);
  return bytes + std::string(payload);
}

std::string recordOf(std::shared_ptr<const HVFeedback> feedback, std::int64_t queryId) {
  std::string bytes;
  appendStoredFeedback({std::move(feedback), queryId, 0, 0}, bytes);
  return framed(bytes);
}

std::string headerRecord() {
  CZClientSession header;
  header.agent = "Lanthe/9";
  header.previousSessionEndReason = 2;
  std::string bytes;
  appendRecord(header, bytes);
  return framed(bytes);
}

const std::string kVersion = framed("Zelkord/1.0 (x)");

std::string faultOf(std::string_view bytes) {
  const auto read = parseContainer(bytes);
  const auto* fault = std::get_if<ContainerFault>(&read);
  return fault ? fault->text : "";
}

TEST(ContainerFileTest, RefusesEveryDamageAndSaysWhereItIs) {
  const auto whole =
      kVersion + headerRecord() + recordOf(std::make_shared<HVEndSearchFeedback>(), 1);
  EXPECT_EQ(faultOf(whole), "");
  for (std::size_t size = 0; size < whole.size(); ++size) {
    const bool isBoundary = size == kVersion.size() + headerRecord().size();
    EXPECT_EQ(faultOf(std::string_view(whole).substr(0, size)).empty(), isBoundary) << size;
  }
  const auto at = std::to_string(whole.size());
  const auto payloadAt = std::to_string(whole.size() + 8);
  const auto unknownValue = [] {
    auto end = std::make_shared<ZelkorSessionEndFeedback>();
    end->reason.value = 99;
    return recordOf(end, 0);
  };
  const std::pair<std::string, std::string> cases[] = {
      {"", "the file is empty"},
      {framed("other"), "the file begins with no version"},
      {kVersion, "the file has no session header"},
      {whole + std::string(8, '\0'), "the record at byte " + at + " has a length of 0"},
      {whole + std::string(8, '\xFF'), "the record at byte " + at + " is longer than the file"},
      {whole + "\x05", "the record at byte " + at + " is cut inside a length"},
      {whole + framed("\xFF"), "the record at byte " + payloadAt + " does not decode"},
      {whole + unknownValue(),
       "the record at byte " + payloadAt + " has a value that stands in no table"},
  };
  for (const auto& [bytes, text] : cases) EXPECT_EQ(faultOf(bytes), text);
}

TEST(FeedbackMessagesTest, JsonNamesTheFieldsOfTheMessages) {
  const std::pair<std::string, std::string> names[] = {
      {"HVErrorFeedback", "CZErrorFeedback"},
      {"CZErrorFeedback", "CZErrorFeedback"},
      {"ZLKCacheHitFeedback", "CZCacheHitFeedback"},
      {"ZelkorSessionMissingResults", "CZSessionMissingResultsFeedback"}};
  for (const auto& [name, message] : names) EXPECT_EQ(messageNameOf(name), message);
  std::string problem;
  const auto message = messageFromJson("HVResultEngagementFeedback",
                                       R"({"trigger_event":2,"result":{"id":"r"}})", problem);
  ASSERT_TRUE(message) << problem;
  EXPECT_EQ(json::serialize(jsonOfMessage("HVResultEngagementFeedback", *message)),
            R"({"trigger_event":2,"result":{"id":"r"}})");
  for (const auto* json : {"{", "[]", R"({"strange":1})", R"({"trigger_event":"x"})"}) {
    problem.clear();
    EXPECT_FALSE(messageFromJson("HVResultEngagementFeedback", json, problem)) << json;
    EXPECT_NE(problem, "");
  }
  EXPECT_FALSE(messageFromJson("HVStrangeFeedback", "{}", problem));
  EXPECT_EQ(problem, "no feedback class 'HVStrangeFeedback'");
  EXPECT_TRUE(jsonOfMessage("HVErrorFeedback", "\xFF").is_null());
}

class FeedbackCommandsTest : public testing::Test {
 protected:
  FeedbackCommandsTest() {
    char folder[] = "/tmp/zelkorctl.XXXXXX";
    folder_ = ::mkdtemp(folder);
    ::setenv("XDG_CACHE_HOME", folder_.c_str(), 1);
    std::filesystem::create_directory(cachesFolder());
    daemon_.reply("Configure", "s", "unix:path=/nowhere");
  }
  void TearDown() override {
    ::unsetenv("XDG_CACHE_HOME");
    std::filesystem::remove_all(folder_);
  }
  void write(const std::string& name, const std::string& bytes) {
    std::ofstream(cachesFolder() + "/" + name, std::ios::binary) << bytes;
  }
  int run(std::vector<std::string> arguments) {
    out_.str("");
    err_.str("");
    arguments.insert(arguments.end(), {"--socket", daemon_.path(), "--timeout", "20"});
    return runTool(arguments, {out_, err_});
  }

  std::string folder_;
  TinyDaemon daemon_;
  std::ostringstream out_;
  std::ostringstream err_;
};

TEST_F(FeedbackCommandsTest, ListsAndShowsTheSessionsOnTheDisk) {
  write("session.12", kVersion + headerRecord() +
                          recordOf(std::make_shared<HVEndSearchFeedback>(), 7) +
                          recordOf(std::make_shared<ZelkorSessionEndFeedback>(6), 0));
  write("session.3", kVersion + headerRecord());
  write("session.4", "torn");
  write("session.x", "");
  write("session.3000000000", "");
  ASSERT_EQ(run({"containers"}), kAnswered);
  EXPECT_THAT(out_.str(), HasSubstr("session.3     0 records"));
  EXPECT_THAT(out_.str(), HasSubstr("Lanthe/9, not ended"));
  EXPECT_THAT(out_.str(), HasSubstr("damaged: the record at byte 0 is cut inside a length"));
  EXPECT_THAT(out_.str(), HasSubstr("engagement received"));
  ASSERT_EQ(run({"containers", "--json"}), kAnswered);
  EXPECT_EQ(parseJson(out_.str())->as_array().size(), 3u);
  ASSERT_EQ(run({"containers", "12", "--json"}), kAnswered);
  const auto shown = *parseJson(out_.str());
  EXPECT_EQ(shown.at("header").at("previous_session_end_reason"), "session idle");
  EXPECT_EQ(shown.at("records").at(0).at("class"), "HVEndSearchFeedback");
  EXPECT_EQ(shown.at("records").at(0).at("query_id"), 7);
  EXPECT_EQ(shown.at("records").at(1).at("feedback").at("reason"), "6");
  EXPECT_EQ(run({"containers", "4"}), kErrorReply);
  EXPECT_THAT(err_.str(), HasSubstr("session.4: the record at byte 0"));
  EXPECT_EQ(run({"containers", "99"}), kErrorReply);
  EXPECT_EQ(run({"containers", "x"}), kWrongUsage);
}

TEST_F(FeedbackCommandsTest, ReportsAndTellsWhetherItWasTaken) {
  std::string className;
  std::size_t bytes = 0;
  daemon_.on("ReportEvent", [&](sd_bus_message* call) {
    const char* event = nullptr;
    const char* name = nullptr;
    std::int64_t queryId = 0;
    const void* data = nullptr;
    sd_bus_message_read(call, "sxs", &event, &queryId, &name);
    sd_bus_message_read_array(call, 'y', &data, &bytes);
    className = std::string(event) + "/" + std::to_string(queryId) + "/" + name;
    sd_bus_reply_method_return(call, "");
  });
  EXPECT_EQ(
      run({"report", "HVDidGoToSiteFeedback", R"({"input":"x"})", "--event", "e", "--query-id=-3"}),
      kAnswered);
  EXPECT_EQ(className, "e/-3/HVDidGoToSiteFeedback");
  EXPECT_EQ(bytes, 3u);
  EXPECT_EQ(out_.str(), "accepted HVDidGoToSiteFeedback\n");
  daemon_.on("ReportEvent", [](sd_bus_message* call) {
    sd_bus_reply_method_errorf(call, "org.freedesktop.DBus.Error.InvalidArgs", "not so");
  });
  EXPECT_EQ(run({"report", "HVDidGoToSiteFeedback"}), kErrorReply);
  EXPECT_THAT(err_.str(), HasSubstr("not so"));
  EXPECT_EQ(run({"report", "HVStrangeFeedback"}), kWrongUsage);
  EXPECT_EQ(run({"report"}), kWrongUsage);
}

TEST_F(FeedbackCommandsTest, ShowsWhatIsInMemory) {
  daemon_.on("Feedback", [](sd_bus_message* call) {
    sd_bus_reply_method_return(call, "asa{sv}", 1, R"({"type":"error"})", 0);
  });
  EXPECT_EQ(run({"feedback"}), kAnswered);
  EXPECT_EQ(out_.str(), "{\"type\":\"error\"}\n");
  EXPECT_EQ(run({"feedback", "--json"}), kAnswered);
  EXPECT_EQ(out_.str(), "[{\"type\":\"error\"}]\n");
}

}  // namespace
}  // namespace zelkorctl
