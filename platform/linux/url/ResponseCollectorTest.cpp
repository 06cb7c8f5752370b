#include <gtest/gtest.h>

#include "platform/linux/url/ResponseCollector.h"

namespace zelkord {
namespace {

void addHeaderLines(ResponseCollector& collector, std::initializer_list<std::string_view> lines) {
  for (const auto line : lines) ASSERT_TRUE(collector.addHeaderLine(line)) << line;
}

TEST(ResponseCollectorTest, KeepsTheFinalResponseOnly) {
  ResponseCollector collector;
  collector.begin(100);
  addHeaderLines(collector, {"HTTP/1.1 103 Early\r\n", "Link: x\r\n", "\r\n", "HTTP/2 200 \r\n",
                             "Vary:  a \r\n", "X-Long: b\r\n", "\t c\r\n", "no colon\r\n", "\r\n"});
  EXPECT_TRUE(collector.addBody("body"));
  addHeaderLines(collector, {"X-Trailer: late\r\n", "\r\n"});
  const auto response = collector.takeResponse("u");
  ASSERT_TRUE(response);
  EXPECT_EQ(response->status, 200);
  EXPECT_EQ(response->headers, (HTTPHeaders{{"Vary", "a"}, {"X-Long", "b c"}}));
  EXPECT_EQ(collector.takeBody(), "body");
}

TEST(ResponseCollectorTest, StopsAtItsLimits) {
  ResponseCollector collector;
  collector.begin(4);
  EXPECT_TRUE(collector.addBody("1234"));
  EXPECT_FALSE(collector.addBody("5"));
  EXPECT_TRUE(collector.isTooLarge());

  collector.begin(4);
  const std::string line = "A: " + std::string(10000, 'b') + "\r\n";
  int accepted = 0;
  while (collector.addHeaderLine(line)) ++accepted;
  EXPECT_EQ(accepted, 26);
  EXPECT_TRUE(collector.isTooLarge());
}

TEST(ResponseCollectorTest, HasNoResponseWithoutAStatus) {
  for (const char* line : {"HTTP/1.1\r\n", "HTTP/1.1 abc\r\n", "Date: now\r\n"}) {
    SCOPED_TRACE(line);
    ResponseCollector collector;
    collector.begin(4);
    collector.addHeaderLine(line);
    EXPECT_FALSE(collector.takeResponse("u"));
  }
}

}  // namespace
}  // namespace zelkord
