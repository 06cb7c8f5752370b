#include <gtest/gtest.h>

#include <cstdlib>
#include <future>
#include <memory>
#include <string>

#include "platform/linux/url/URLSessionTestSupport.h"
#include "platform/testing/TestHTTPServer.h"

namespace zelkord {
namespace {

TEST(CurlURLSessionTLSTest, LoadsOnlyFromTrustedServers) {
  using Validity = TestCertificate::Validity;
  const struct {
    const char* name;
    TestCertificate certificate;
    bool trusted;
    std::int64_t code;
  } cases[] = {
      {"good", TestCertificate::make("127.0.0.1"), true, 0},
      {"unknown issuer", TestCertificate::make("127.0.0.1"), false, -1200},
      {"expired", TestCertificate::make("127.0.0.1", Validity::Expired), true, -1200},
      {"other host", TestCertificate::make("other.example"), true, -1200},
      {"subject only", TestCertificate::make("127.0.0.1", Validity::NamedBySubject), true, -1200},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.name);
    TestHTTPServer server(test.certificate);
    server.reply("/", TestHTTPReply::make(200, "hello"));
    const URLTestFile roots(test.trusted ? test.certificate.certificate : "");
    URLSessionTestBed bed({.rootsFile = test.trusted ? roots.path() : ""});
    const auto session = bed.make({.name = "test", .tlsSessionTickets = true});
    const auto outcome = loadURL(*session, {.url = server.url("/")});
    EXPECT_EQ(outcome.errorCode(), test.code);
    EXPECT_EQ(outcome.text(), test.code == 0 ? "hello" : "");
    EXPECT_EQ(outcome.timing.tls > 0, test.code == 0);
    EXPECT_EQ(server.requests().size(), test.code == 0 ? 1u : 0u);
  }
}

TEST(CurlURLSessionTLSTest, SendsQueriesAsLongAsClientsMayAsk) {
  const auto certificate = TestCertificate::make("127.0.0.1");
  const URLTestFile roots(certificate.certificate);
  TestHTTPServer server(certificate);
  const auto path = "/?q=" + std::string(200'000, 'a');
  server.reply("/", TestHTTPReply::make(200, "long"));
  URLSessionTestBed bed({.rootsFile = roots.path()});
  const auto session = bed.make({.name = "test"});
  const auto outcome = loadURL(*session, {.url = server.url(path), .timeout = 20s});
  EXPECT_EQ(outcome.text(), "long");
}

TEST(CurlURLSessionTLSTest, ResumesTLSSessionsUnlessToldNotTo) {
  const auto certificate = TestCertificate::make("127.0.0.1");
  const URLTestFile roots(certificate.certificate);
  for (const bool tickets : {true, false}) {
    SCOPED_TRACE(tickets);
    TestHTTPServer server(certificate);
    auto reply = TestHTTPReply::make(200, "a");
    reply.ending = TestHTTPReply::Ending::Close;
    server.reply("/", reply);
    URLSessionTestBed bed({.rootsFile = roots.path()});
    const auto session = bed.make({.name = "test", .tlsSessionTickets = tickets});
    loadURL(*session, {.url = server.url("/")});
    loadURL(*session, {.url = server.url("/")});
    EXPECT_TRUE(server.waitForCloses(2));
    EXPECT_EQ(server.resumedSessions(), tickets ? 1 : 0);
  }
}

TEST(CurlURLSessionTLSTest, IsNeverRedirectedToUnencryptedHTTP) {
  const auto certificate = TestCertificate::make("127.0.0.1");
  const URLTestFile roots(certificate.certificate);
  TestHTTPServer server(certificate);
  TestHTTPServer plain;
  server.reply("/", TestHTTPReply::redirect(302, plain.url("/")));
  URLSessionTestBed bed({.rootsFile = roots.path()});
  const auto outcome = loadURL(*bed.make(), {.url = server.url("/")});
  EXPECT_EQ(outcome.errorCode(), -1022);
  EXPECT_EQ(plain.connections(), 0);
}

class FixedProxy final : public ProxyConfigurationSource {
 public:
  explicit FixedProxy(ProxyConfiguration configuration)
      : configuration_(std::make_shared<ProxyConfiguration>(std::move(configuration))) {}
  std::shared_ptr<const ProxyConfiguration> proxyConfiguration() const override {
    return configuration_;
  }

 private:
  const std::shared_ptr<const ProxyConfiguration> configuration_;
};

std::shared_ptr<FixedProxy> proxyFor(const TestHTTPServer& proxy, const std::string& host) {
  return std::make_shared<FixedProxy>(ProxyConfiguration{proxy.url(""), {host}});
}

TEST(CurlURLSessionProxyTest, SendsListedHostsOfRoutedRequestsThroughTheProxy) {
  const auto certificate = TestCertificate::make("listed.example");
  const URLTestFile roots(certificate.certificate);
  TestHTTPServer server(certificate);
  TestHTTPServer proxy;
  server.reply("/", TestHTTPReply::make(200, "hello"));
  URLSessionTestBed bed({.proxies = proxyFor(proxy, "LISTED.example"), .rootsFile = roots.path()});
  const auto session = bed.make();
  const URLRequest request{.url = server.url("/", "listed.example"),
                           .headers = {{"X-Quenta-Id", "1"}}};
  URLResults results;
  const auto task = session->dataTask(routedForm(request), results.completion());
  EXPECT_TRUE(task->enableProxy(nullptr));
  task->resume();
  EXPECT_EQ(results.wait(1).front().status(), 200);
  const auto connect = proxy.requests().at(0);
  EXPECT_EQ(connect.target, "listed.example:" + std::to_string(server.port()));
  EXPECT_EQ(connect.header("X-Quenta-Id"), std::nullopt);

  std::promise<std::optional<json::object>> answer;
  task->connectionInformation([&](auto information) { answer.set_value(std::move(information)); });
  const auto information = answer.get_future().get();
  ASSERT_TRUE(information);
  EXPECT_EQ(stringIn(*information, "proxy"), proxy.url(""));
  EXPECT_EQ(stringIn(*information, "protocol"), "http/1.1");
  EXPECT_TRUE(numberIn(*information, "connect_time"));
}

TEST(CurlURLSessionProxyTest, GoesStraightOtherwise) {
  TestHTTPServer server;
  TestHTTPServer proxy;
  URLSessionTestBed bed({.proxies = proxyFor(proxy, "listed.example")});
  const auto session = bed.make();
  for (const bool routed : {true, false}) {
    SCOPED_TRACE(routed);
    URLResults results;
    const auto task =
        session->dataTask({.url = server.url("/"), .routed = routed}, results.completion());
    EXPECT_TRUE(task->enableProxy(nullptr));
    task->resume();
    EXPECT_EQ(results.wait(1).front().status(), 404);
  }
  EXPECT_EQ(proxy.connections(), 0);
}

// A variable of the environment, for the length of a test.
class EnvironmentVariable {
 public:
  EnvironmentVariable(const char* name, const std::string& value) : name_(name) {
    setenv(name, value.c_str(), 1);
  }
  ~EnvironmentVariable() { unsetenv(name_); }
  EnvironmentVariable(const EnvironmentVariable&) = delete;
  EnvironmentVariable& operator=(const EnvironmentVariable&) = delete;

 private:
  const char* const name_;
};

TEST(CurlURLSessionProxyTest, LeavesTheEnvironmentsProxiesAndExceptionsAlone) {
  const auto certificate = TestCertificate::make("listed.example");
  const URLTestFile roots(certificate.certificate);
  TestHTTPServer server(certificate), plain, ours, theirs;
  server.reply("/", TestHTTPReply::make(200, "through ours"));
  plain.reply("/", TestHTTPReply::make(200, "straight"));
  const EnvironmentVariable http("http_proxy", theirs.url("")),
      https("https_proxy", theirs.url("")), all("ALL_PROXY", theirs.url("")),
      none("no_proxy", "listed.example");
  URLSessionTestBed bed({.proxies = proxyFor(ours, "listed.example"), .rootsFile = roots.path()});
  const auto session = bed.make();
  EXPECT_EQ(loadURL(*session, {.url = plain.url("/")}).text(), "straight");
  URLResults results;
  const auto task = session->dataTask({.url = server.url("/", "listed.example"), .routed = true},
                                      results.completion());
  EXPECT_TRUE(task->enableProxy(nullptr));
  task->resume();
  EXPECT_EQ(results.wait(1).front().data.value_or(Data()).view(), "through ours");
  EXPECT_EQ(ours.connections(), 1);
  EXPECT_EQ(theirs.connections(), 0);
}

TEST(CurlURLSessionProxyTest, SaysWhenThereIsNoProxy) {
  URLSessionTestBed bed;
  const auto session = bed.make();
  const auto task = session->dataTask({.url = "https://a.example/", .routed = true}, {});
  Error error;
  EXPECT_FALSE(task->enableProxy(&error));
  EXPECT_EQ(error.domain, kURLErrorDomain);
}

}  // namespace
}  // namespace zelkord
