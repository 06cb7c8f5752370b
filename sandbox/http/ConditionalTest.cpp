#include <gtest/gtest.h>

#include "sandbox/http/Conditional.h"

namespace sandbox {

TEST(ConditionalTest, AnswersThatTheClientHasAreNotSentAgain) {
  constexpr std::time_t kModified = 784111777;  // Sun, 06 Nov 1994 08:49:37 GMT
  struct Case {
    const char* name;
    const char* value;
    unsigned status;
  };
  const std::initializer_list<Case> cases = {
      {"X-Other", "", 200},
      {"If-None-Match", "\"7\"", 304},
      {"if-none-match", "7", 304},
      {"If-None-Match", "\"1\", W/\"7\"", 304},
      {"If-None-Match", "*", 304},
      {"If-None-Match", "\"8\"", 200},
      {"If-Modified-Since", "Sun, 06 Nov 1994 08:49:37 GMT", 304},
      {"If-Modified-Since", "Sun, 06 Nov 1994 08:49:36 GMT", 200},
      {"If-Modified-Since", "yesterday", 200},
  };
  for (const auto& [name, value, status] : cases) {
    SCOPED_TRACE(std::string(name) + ": " + value);
    Request request;
    request.headers = {{name, value}};
    const Reply reply = withValidators(request, Reply::json(200, "[]"), "\"7\"", kModified);
    EXPECT_EQ(reply.status, status);
    EXPECT_EQ(reply.bodyText().empty(), status == 304);
    EXPECT_EQ(findHeader(reply.headers, "last-modified"), "Sun, 06 Nov 1994 08:49:37 GMT");
  }
}

TEST(ConditionalTest, ATagThatDiffersWinsOverAnOldDate) {
  Request request;
  request.headers = {{"If-None-Match", "\"8\""},
                     {"If-Modified-Since", "Sun, 06 Nov 2044 08:49:37 GMT"}};
  EXPECT_EQ(withValidators(request, Reply::json(200, "[]"), "\"7\"", 1).status, 200U);
}

}  // namespace sandbox
