#include <curl/curl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <boost/json/parse.hpp>

#include "sandbox/Sandbox.h"
#include "sandbox/TestData.h"
#include "sandbox/core/Files.h"

namespace sandbox {

namespace {

struct Fetched {
  CURLcode code = CURLE_OK;
  long status = 0;
  long newConnections = 0;
  std::string body;
  std::string head;
};

std::size_t appendBytes(char* bytes, std::size_t size, std::size_t count, void* target) {
  static_cast<std::string*>(target)->append(bytes, size * count);
  return size * count;
}

// A client that keeps its connection and trusts one certificate.
class Client final {
 public:
  explicit Client(std::string certificate)
      : certificate_(std::move(certificate)), curl_(curl_easy_init()) {
    curl_easy_setopt(curl_, CURLOPT_TIMEOUT, 20L);
  }
  Client(const Client&) = delete;
  Client& operator=(const Client&) = delete;
  ~Client() { curl_easy_cleanup(curl_); }

  Fetched get(const std::string& url) {
    Fetched fetched;
    curl_easy_setopt(curl_, CURLOPT_URL, url.c_str());
    curl_easy_setopt(curl_, CURLOPT_CAINFO, certificate_.c_str());
    curl_easy_setopt(curl_, CURLOPT_ACCEPT_ENCODING, "gzip");
    curl_easy_setopt(curl_, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(curl_, CURLOPT_WRITEFUNCTION, &appendBytes);
    curl_easy_setopt(curl_, CURLOPT_WRITEDATA, &fetched.body);
    curl_easy_setopt(curl_, CURLOPT_HEADERDATA, &fetched.head);
    fetched.code = curl_easy_perform(curl_);
    curl_easy_getinfo(curl_, CURLINFO_RESPONSE_CODE, &fetched.status);
    curl_easy_getinfo(curl_, CURLINFO_NUM_CONNECTS, &fetched.newConnections);
    return fetched;
  }

  Fetched post(const std::string& url, const std::string& body) {
    curl_easy_setopt(curl_, CURLOPT_POSTFIELDSIZE, static_cast<long>(body.size()));
    curl_easy_setopt(curl_, CURLOPT_COPYPOSTFIELDS, body.c_str());
    Fetched fetched = get(url);
    curl_easy_setopt(curl_, CURLOPT_HTTPGET, 1L);
    return fetched;
  }

  void set(CURLoption option, long value) { curl_easy_setopt(curl_, option, value); }

 private:
  const std::string certificate_;
  CURL* const curl_;
};

class SandboxTest : public ::testing::Test {
 protected:
  SandboxTest() : sandbox_(std::move(*Sandbox::start(setup()))) {}

  Sandbox::Setup setup() const { return {folder_.path() / "state", sources_, 0, 2}; }
  std::string certificate() const { return (folder_.path() / "state/cert.pem").string(); }
  std::string url(const std::string& path) const { return sandbox_->url() + path; }

  TemporaryFolder folder_;
  DataSources sources_ = writeTinyData(folder_.path() / "data");
  std::unique_ptr<Sandbox> sandbox_;
};

}  // namespace

TEST_F(SandboxTest, ServesAClientThatTrustsItsCertificateOverOneConnection) {
  Client client(certificate());
  const Fetched bag = client.get(url("/bag?key=harbor4817&cc=FR"));
  ASSERT_EQ(bag.code, CURLE_OK);
  const std::string search(boost::json::parse(bag.body).at("search_url").get_string());
  const Fetched found = client.get(search + "?q=fra&key=harbor4817");
  EXPECT_EQ(found.newConnections, 0);
  const auto sets = boost::json::parse(found.body);
  const std::string icon(sets.at(0).at("results").at(0).at("icon").at("url").get_string());
  EXPECT_EQ(client.get(icon).body, *readFile(sources_.flags() / "fr.png"));
}

TEST_F(SandboxTest, AClientWithoutTheCertificateRefuses) {
  struct stat status {};
  ASSERT_EQ(::stat((folder_.path() / "state/key.pem").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777U, 0600U);
  Client client("/etc/ssl/certs/ca-certificates.crt");
  EXPECT_NE(client.get(url("/warm")).code, CURLE_OK);
}

TEST_F(SandboxTest, BodiesOfAnySizeArriveWhole) {
  Client client(certificate());
  for (const std::size_t size : {2'000U, 16'384U, 16'385U, 20'000U, 200'000U, 3'000'000U}) {
    SCOPED_TRACE(size);
    const Fetched fetched =
        client.get(url("/search?q=zz&key=harbor4817&pad=" + std::to_string(size)));
    EXPECT_EQ(fetched.code, CURLE_OK);
    EXPECT_GE(fetched.body.size(), size);
  }
}

TEST_F(SandboxTest, TakesTheLongestQueriesThatClientsSend) {
  std::string query;
  for (int count = 0; count < 65'536; ++count) query += "%C3%A9";
  Client client(certificate());
  // libcurl 7.88 stalls when a request's head needs more than two of its upload buffers (64 KiB).
  client.set(CURLOPT_UPLOAD_BUFFERSIZE, 1 << 20);
  EXPECT_EQ(client.get(url("/search?key=harbor4817&q=" + query)).status, 200);
}

TEST_F(SandboxTest, ResumesTlsSessionsAndLogsConnections) {
  Client client(certificate());
  client.get(url("/warm"));
  client.set(CURLOPT_FRESH_CONNECT, 1);
  client.get(url("/warm?a&b=%20"));
  client.set(CURLOPT_FRESH_CONNECT, 0);
  const auto logged =
      boost::json::parse(client.get(url("/control/requests?path=/warm")).body).at("requests");
  ASSERT_EQ(logged.get_array().size(), 2U);
  EXPECT_EQ(logged.at(0).at("tls_session_reused"), false);
  EXPECT_EQ(logged.at(1).at("tls_session_reused"), true);
  EXPECT_NE(logged.at(0).at("connection"), logged.at(1).at("connection"));
  EXPECT_EQ(logged.at(1).at("target"), "/warm?a&b=%20");
}

TEST_F(SandboxTest, MisbehavesOnTheWire) {
  struct Case {
    const char* rule;
    CURLcode code;
  };
  for (const auto& [rule, code] : std::initializer_list<Case>{
           {R"({"path":"/search","kind":"close","count":2})", CURLE_GOT_NOTHING},
           {R"({"path":"/search","kind":"close_after_headers"})", CURLE_PARTIAL_FILE},
           {R"({"path":"/search","kind":"truncated"})", CURLE_PARTIAL_FILE},
           {R"({"path":"/search","kind":"not_http"})", CURLE_UNSUPPORTED_PROTOCOL},
           {R"({"path":"/search","kind":"wrong_length","bytes":100})", CURLE_OK},
           {R"({"path":"/search","kind":"slow","interval_ms":1,"body":"[1,2]"})", CURLE_OK},
           {R"({"path":"/search","kind":"gzip_bomb","bytes":10000000})", CURLE_OK},
           {R"({"path":"/search","delay_ms":1})", CURLE_OK}}) {
    SCOPED_TRACE(rule);
    Client client(certificate());
    EXPECT_EQ(client.post(url("/control/misbehave"), rule).status, 200);
    EXPECT_EQ(client.get(url("/search?q=sno&key=harbor4817")).code, code);
    client.post(url("/control/behave"), "");
    EXPECT_EQ(client.get(url("/search?q=sno&key=harbor4817")).status, 200);
  }
}

TEST_F(SandboxTest, AfterABodyShorterThanAnnouncedNothingComes) {
  Client client(certificate());
  client.post(url("/control/misbehave"),
              R"({"path":"/warm","kind":"wrong_length","body":"[1]","bytes":4})");
  client.set(CURLOPT_TIMEOUT_MS, 300);
  const Fetched fetched = client.get(url("/warm"));
  EXPECT_EQ(fetched.code, CURLE_OPERATION_TIMEDOUT);
  EXPECT_EQ(fetched.body, "[1]");
}

TEST_F(SandboxTest, AnEndlessBodyGoesOnUntilTheClientHasEnough) {
  Client client(certificate());
  client.post(url("/control/misbehave"), R"({"path":"/search","kind":"endless"})");
  client.set(CURLOPT_TIMEOUT_MS, 300);
  const Fetched fetched = client.get(url("/search?q=sno&key=harbor4817"));
  EXPECT_NE(fetched.head.find("chunked"), std::string::npos);
  EXPECT_FALSE(fetched.body.empty());
}

TEST_F(SandboxTest, WhatIsNoProperRequestGetsA400) {
  Client client(certificate());
  client.set(CURLOPT_PATH_AS_IS, 1);
  EXPECT_EQ(client.get(url("/search?q=%zz")).status, 400);
  EXPECT_EQ(client.get(url("/warm")).status, 204);
}

TEST_F(SandboxTest, AStateFolderServesOneAtATimeAndIsKept) {
  EXPECT_FALSE(Sandbox::start(setup()));
  const auto before = readFile(certificate());
  sandbox_.reset();
  sandbox_ = std::move(*Sandbox::start(setup()));
  EXPECT_EQ(readFile(certificate()), before);
  Client client(certificate());
  EXPECT_EQ(client.get(url("/warm")).status, 204);
}

}  // namespace sandbox
