#include <gtest/gtest.h>

#include <boost/json/parse.hpp>
#include <boost/json/serialize.hpp>

#include "sandbox/TestData.h"
#include "sandbox/core/Gzip.h"
#include "sandbox/service/Service.h"

namespace sandbox {

namespace {

namespace json = boost::json;

class ServiceTest : public ::testing::Test {
 protected:
  Reply ask(const std::string& target, Headers headers = {}, const std::string& method = "GET",
            const std::string& body = "") {
    Request request;
    request.method = method;
    request.target = target;
    auto parsed = parseTarget(target);
    request.path = parsed->path;
    request.items = parsed->items;
    request.headers = std::move(headers);
    request.body = body;
    return service_.handle(std::move(request));
  }

  Reply control(const std::string& path, const std::string& body) {
    return ask(path, {}, "POST", body);
  }

  TinyIndex index_;
  std::unique_ptr<RequestLog> log_ = *RequestLog::open(index_.folder() / "requests.db");
  std::unique_ptr<UploadStore> uploads_ = *UploadStore::open(index_.folder() / "uploads.db");
  Service service_{{index_.pool(), *log_, *uploads_}, index_.sources(), "https://localhost:1"};
};

}  // namespace

TEST_F(ServiceTest, ChecksKeyPathAndMethod) {
  struct Case {
    const char* method;
    const char* target;
    unsigned status;
  };
  for (const auto& [method, target, status] :
       std::initializer_list<Case>{{"GET", "/search?q=a", 403},
                                   {"GET", "/search?q=a&key=wrong", 403},
                                   {"GET", "/search?q=a&key=harbor4817", 200},
                                   {"HEAD", "/search?q=a&key=harbor4817", 200},
                                   {"POST", "/search?q=a&key=harbor4817", 405},
                                   {"GET", "/feedback?key=harbor4817", 405},
                                   {"POST", "/feedback?key=harbor4817", 400},
                                   {"GET", "/warm", 204},
                                   {"GET", "/image/flags/fr.png", 200},
                                   {"GET", "/image/flags/xx.png", 404},
                                   {"GET", "/resource/crowdsourcing_blacklist", 403},
                                   {"GET", "/card?id=1&key=harbor4817", 200},
                                   {"GET", "/card?id=x&key=harbor4817", 404},
                                   {"GET", "/more?q=sn&key=harbor4817", 200},
                                   {"GET", "/related?q=sn&key=harbor4817", 200},
                                   {"GET", "/nothing?key=harbor4817", 404},
                                   {"GET", "/control/nothing", 404}}) {
    SCOPED_TRACE(std::string(method) + " " + target);
    EXPECT_EQ(ask(target, {}, method).status, status);
  }
}

TEST_F(ServiceTest, TellsTheKindsOfSearchApart) {
  const auto firstQuery = [&](const std::string& items) {
    const auto sets = json::parse(ask("/search?key=harbor4817&" + items).bodyText());
    return std::string(sets.at(0).at("query").get_string());
  };
  EXPECT_EQ(firstQuery("q=sno"), "snow");
  EXPECT_EQ(firstQuery("q=sno&ltype=default"), "sno");
  EXPECT_EQ(firstQuery("qtype=zkw&cc=FR"), "");
  EXPECT_EQ(firstQuery("q=sno&qtype=suggested"), "snow");
}

TEST_F(ServiceTest, PacksLargeAnswersForClientsThatTakeGzip) {
  const std::string target = "/search?q=sno&key=harbor4817";
  const Reply plain = ask(target);
  const Reply packed = ask(target, {{"Accept-Encoding", "gzip"}});
  EXPECT_FALSE(findHeader(plain.headers, "Content-Encoding"));
  EXPECT_EQ(findHeader(packed.headers, "Content-Encoding"), "gzip");
  EXPECT_EQ(findHeader(packed.headers, "Vary"), "Accept-Encoding");
  EXPECT_LT(packed.bodyText().size(), plain.bodyText().size());
  EXPECT_FALSE(findHeader(ask("/image/flags/fr.png", {{"Accept-Encoding", "gzip"}}).headers,
                          "Content-Encoding"));
}

TEST_F(ServiceTest, PadsAnswersToTheSizeAskedFor) {
  for (const std::size_t size : {5'000U, 20'000U, 200'000U}) {
    const Reply reply = ask("/search?q=sno&key=harbor4817&pad=" + std::to_string(size),
                            {{"Accept-Encoding", "gzip"}});
    EXPECT_EQ(reply.bodyText().size(), size);
    EXPECT_EQ(json::parse(reply.bodyText()).at(0).at("query"), "snow");
  }
  EXPECT_GT(ask("/search?q=sno&key=harbor4817&pad=10").bodyText().size(), 10U);
}

TEST_F(ServiceTest, MisbehavesAsToldAndLogsWhatItDid) {
  EXPECT_EQ(control("/control/misbehave", R"({"path":"/search","kind":"nonsense"})").status, 400U);
  EXPECT_EQ(control("/control/misbehave", "{").status, 400U);
  control("/control/misbehave", R"({"path":"/search","status":503,"headers":{"Retry-After":"9"}})");
  control(
      "/control/misbehave",
      R"({"path":"/search","kind":"close_after_headers","delay_ms":20,"headers":{"X-Quenta-ForceFetch":"{}"}})");
  const Reply refused = ask("/search?q=sno&key=harbor4817");
  EXPECT_EQ(refused.status, 503U);
  EXPECT_EQ(findHeader(refused.headers, "Retry-After"), "9");
  const Reply cut = ask("/search?q=sno&key=harbor4817", {{"Accept-Encoding", "gzip"}});
  EXPECT_EQ(cut.delivery, Delivery::CloseAfterHeaders);
  EXPECT_EQ(cut.delay.count(), 20);
  EXPECT_EQ(findHeader(cut.headers, "x-quenta-forcefetch"), "{}");
  EXPECT_EQ(ask("/search?q=sno&key=harbor4817").delivery, Delivery::Ordinary);
  const auto logged = json::parse(ask("/control/requests?path=/search").bodyText());
  ASSERT_EQ(logged.at("requests").get_array().size(), 3U);
  EXPECT_EQ(logged.at("requests").at(0).at("status"), 503);
  EXPECT_EQ(logged.at("last"), 3);
}

TEST_F(ServiceTest, EmbedsImageDescriptorsAnywhereInItsAnswers) {
  EXPECT_EQ(control("/control/images", R"({"keys":"icon"})").status, 400U);
  EXPECT_EQ(control("/control/images", R"({"per_key":0})").status, 400U);
  struct Case {
    const char* wish;
    const char* value;
  };
  for (const auto& [wish, value] : std::initializer_list<Case>{
           {R"({"ids":["word"]})", R"([{"image":{"id":"word"}}])"},
           {R"({"count":3,"keys":["icon","posters"],"urls":["https://a/{n}"]})",
            R"([{"icon":{"url":"https://a/0"}},{"posters":{"url":"https://a/1"}},
                {"icon":{"url":"https://a/2"}}])"},
           {R"({"count":3,"per_key":2,"depth":3,"ids":["a\"{n}"]})",
            R"({"inner":[{"inner":[{"image":[{"id":"a\"0"},{"id":"a\"1"}]},
                {"image":[{"id":"a\"2"}]}]}]})"},
           {R"({"count":0})", "[]"}}) {
    SCOPED_TRACE(wish);
    EXPECT_EQ(control("/control/images", wish).status, 200U);
    for (const char* target : {"/search?q=sno", "/more?q=sn", "/card?id=1"}) {
      const Reply reply = ask(std::string(target) + "&key=harbor4817");
      EXPECT_EQ(json::parse(reply.bodyText()).at(0).at("embedded_images"), json::parse(value));
    }
  }
  const Reply packed = ask("/search?q=sno&key=harbor4817", {{"Accept-Encoding", "gzip"}});
  EXPECT_EQ(packed.bodyText(), gzip(ask("/search?q=sno&key=harbor4817").bodyText()));
  control("/control/behave", "");
  const Reply reply = ask("/search?q=sno&key=harbor4817");
  EXPECT_FALSE(json::parse(reply.bodyText()).at(0).get_object().contains("embedded_images"));
}

TEST_F(ServiceTest, ResetPutsEverythingBack) {
  control("/control/misbehave", R"({"count":0,"status":500})");
  control("/control/bag", R"({"version":"13"})");
  EXPECT_EQ(ask("/warm").status, 500U);
  control("/control/behave", "");
  EXPECT_EQ(ask("/warm").status, 204U);
  EXPECT_EQ(findHeader(ask("/search?q=a&key=harbor4817").headers, "X-Quenta-ForceFetch"),
            R"({"bag": 13})");
  control("/control/reset", "");
  EXPECT_EQ(findHeader(ask("/search?q=a&key=harbor4817").headers, "X-Quenta-ForceFetch"),
            R"({"bag": 12})");
  EXPECT_EQ(json::parse(ask("/control/requests").bodyText()).at("requests").get_array().size(), 1U);
}

}  // namespace sandbox
