#include <gtest/gtest.h>

#include <string>

#include "platform/linux/url/CurlErrors.h"
#include "platform/linux/url/RequestPolicy.h"

namespace zelkord {
namespace {

using namespace std::string_literals;

std::int64_t refusalCode(const URLRequest& request) {
  const auto refusal = refusalOf(request);
  return refusal ? refusal->code : 0;
}

TEST(RequestPolicyTest, RefusesWhatMustNotReachTheNetwork) {
  const struct {
    std::string url;
    std::int64_t code;
  } cases[] = {
      {"https://service.example/search?q=a", 0},
      {"http://service.example/", -1022},
      {"http://localhost.service.example/", -1022},
      {"http://128.0.0.1/", -1022},
      {"http://[2001:db8::1]/", -1022},
      {"http://localhost:8080/", 0},
      {"http://LOCALHOST/", 0},
      {"http://127.9.9.9/", 0},
      {"http://0x7f000001/", 0},
      {"http://[::1]:80/", 0},
      {"http://[::ffff:127.0.0.1]/", 0},
      {"http://127.0.0.1@service.example/", -1022},
      {"http://user@127.0.0.1@service.example/", -1002},
      {"file:///etc/passwd", -1002},
      {"ftp://localhost/", -1002},
      {"service.example/search", -1002},
      {"https://", -1002},
      {"", -1002},
      {"https://service.example/a b", -1002},
      {"https://service.example/\r\nX: y", -1002},
      {"https://service.example/\0x"s, -1002},
  };
  for (const auto& [url, code] : cases) {
    SCOPED_TRACE(url);
    EXPECT_EQ(refusalCode({.url = url}), code);
  }
}

TEST(RequestPolicyTest, RefusesHeadersAndMethodsThatCouldAddLines) {
  const struct {
    std::string method, name, value;
    std::int64_t code;
  } cases[] = {
      {"GET", "X-Quenta-A", "plain \"text\" \xc3\xa9", 0},
      {"GET", "X-Quenta-A", "", 0},
      {"GET", "X-Quenta-A", "a\r\nB: c", -1002},
      {"GET", "X-Quenta-A", "a\nb", -1002},
      {"GET", "X-Quenta-A", "a\0b"s, -1002},
      {"GET", "X:A", "b", -1002},
      {"GET", "", "b", -1002},
      {"GET /x HTTP/1.1\r\nA: b", "A", "b", -1002},
      {"", "A", "b", -1002},
  };
  for (const auto& [method, name, value, code] : cases) {
    SCOPED_TRACE(method + "|" + name + "|" + value);
    const URLRequest request{
        .url = "https://service.example/", .method = method, .headers = {{name, value}}};
    EXPECT_EQ(refusalCode(request), code);
  }
}

TEST(RequestPolicyTest, FollowsRedirectsByMethodAndStatus) {
  const struct {
    int status;
    std::string method, expected;
    bool keepsBody;
  } cases[] = {
      {301, "GET", "GET", true},   {301, "POST", "GET", false}, {302, "POST", "GET", false},
      {302, "PUT", "PUT", true},   {303, "POST", "GET", false}, {303, "PUT", "GET", false},
      {303, "HEAD", "HEAD", true}, {307, "POST", "POST", true}, {308, "POST", "POST", true},
  };
  for (const auto& [status, method, expected, keepsBody] : cases) {
    SCOPED_TRACE(method + std::to_string(status));
    const URLRequest request{.url = "https://service.example/a",
                             .method = method,
                             .headers = {{"Content-Type", "text/plain"}, {"Accept", "*/*"}},
                             .body = Data("body")};
    const auto next = redirected(request, {.status = status, .headers = {{"Location", "b"}}});
    const auto& followed = std::get<URLRequest>(next);
    EXPECT_EQ(followed.url, "https://service.example/b");
    EXPECT_EQ(followed.method, expected);
    EXPECT_EQ(followed.body.empty(), !keepsBody);
    EXPECT_EQ(followed.header("Content-Type").has_value(), keepsBody);
    EXPECT_TRUE(followed.header("Accept"));
  }
}

TEST(RequestPolicyTest, KeepsPrivateHeadersFromOtherHostsAndPorts) {
  const struct {
    std::string location;
    std::int64_t code;
    bool keepsHeaders;
  } cases[] = {
      {"/b", 0, true},
      {"https://SERVICE.example:443/b", 0, true},
      {"https://service.example:8443/b", 0, false},
      {"https://other.example/b", 0, false},
      {"//other.example/b", 0, false},
      {"http://service.example/b", -1022, false},
      {"http://localhost/b", -1022, false},
      {"ftp://service.example/b", -1002, false},
      {"file:///etc/passwd", -1002, false},
      {"https://[bad/", -1002, false},
  };
  for (const auto& [location, code, keepsHeaders] : cases) {
    SCOPED_TRACE(location);
    const URLRequest request{
        .url = "https://service.example/a",
        .headers = {{"x-quenta-id", "1"}, {"Authorization", "b"}, {"Accept-Language", "en"}}};
    const auto next = redirected(request, {.status = 302, .headers = {{"Location", location}}});
    if (const auto* error = std::get_if<Error>(&next)) {
      EXPECT_EQ(error->code, code);
      continue;
    }
    EXPECT_EQ(code, 0);
    EXPECT_EQ(std::get<URLRequest>(next).headers.size(), keepsHeaders ? 3u : 1u);
  }
}

TEST(CurlErrorsTest, MapsFailuresToTheCallersActions) {
  const struct {
    CURLcode from;
    std::int64_t to;
  } cases[] = {
      {CURLE_OPERATION_TIMEDOUT, -1001},
      {CURLE_URL_MALFORMAT, -1002},
      {CURLE_COULDNT_RESOLVE_HOST, -1003},
      {CURLE_COULDNT_CONNECT, -1004},
      {CURLE_PARTIAL_FILE, -1005},
      {CURLE_GOT_NOTHING, -1005},
      {CURLE_HTTP2_STREAM, -1005},
      {CURLE_SSL_CONNECT_ERROR, -1200},
      {CURLE_PEER_FAILED_VERIFICATION, -1200},
      {CURLE_BAD_CONTENT_ENCODING, -1},
  };
  for (const auto& [from, to] : cases) {
    SCOPED_TRACE(curl_easy_strerror(from));
    const Error error = errorOfTransfer(from, "");
    EXPECT_EQ(error.domain, kURLErrorDomain);
    EXPECT_EQ(error.code, to);
    EXPECT_EQ(error.reason(), curl_easy_strerror(from));
  }
  EXPECT_EQ(errorOfTransfer(CURLE_COULDNT_CONNECT, "why").reason(), "why");
  EXPECT_EQ(errorOfTransfer(CURLE_COULDNT_CONNECT, "why", ECONNREFUSED).reason(),
            "why: Connection refused");
}

}  // namespace
}  // namespace zelkord
