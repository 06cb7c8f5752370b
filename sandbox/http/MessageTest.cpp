#include <gtest/gtest.h>

#include "sandbox/http/Message.h"

namespace sandbox {

TEST(MessageTest, HeadSaysHowTheBodyEnds) {
  struct Case {
    unsigned status;
    std::optional<std::size_t> length;
    bool keepAlive;
    const char* head;
  };
  for (const auto& [status, length, keepAlive, head] : std::initializer_list<Case>{
           {200, 5, true, "HTTP/1.1 200 OK\r\nA: b\r\nContent-Length: 5\r\n\r\n"},
           {404, 0, false,
            "HTTP/1.1 404 Not Found\r\nA: b\r\nContent-Length: 0\r\nConnection: close\r\n\r\n"},
           {204, 0, true, "HTTP/1.1 204 No Content\r\nA: b\r\n\r\n"},
           {304, 0, true, "HTTP/1.1 304 Not Modified\r\nA: b\r\n\r\n"},
           {200, std::nullopt, true,
            "HTTP/1.1 200 OK\r\nA: b\r\nTransfer-Encoding: chunked\r\n\r\n"}}) {
    SCOPED_TRACE(head);
    EXPECT_EQ(responseHead({.status = status, .headers = {{"A", "b"}}}, length, keepAlive), head);
  }
}

TEST(MessageTest, AHeaderIsReplacedWhateverItsCase) {
  Headers headers = {{"retry-after", "1"}, {"Other", "2"}, {"Retry-After", "3"}};
  setHeader(headers, "RETRY-AFTER", "4");
  EXPECT_EQ(headers, (Headers{{"Other", "2"}, {"RETRY-AFTER", "4"}}));
}

TEST(MessageTest, AnItemWithoutAValueIsNoAnswer) {
  Request request;
  request.items = {{"q", std::nullopt}, {"q", "x"}, {"q", "y"}};
  EXPECT_EQ(request.item("q"), "x");
  EXPECT_FALSE(request.item("Q"));
}

}  // namespace sandbox
