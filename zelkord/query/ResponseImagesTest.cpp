#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "zelkord/network/ImageFetcher.h"
#include "zelkord/query/QueryTestSupport.h"
#include "zelkord/query/ResponseImages.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* kImagesBag = R"({
    "search_url":"https://search.example/s","timeout_interval_for_request":5,
    "resources":{"n":7,"none":"nowhere","first":"https://res.example/r","next":"https://next.example/"},
    "image_identifiers":{"pin":"https://img.example/pin","far":"https://far.example/f",
                         "a":"https://img.example/a"}})";

class ResponseImagesTest : public testing::Test {
 protected:
  ResponseImagesTest() {
    bed_.assembly.setImageFetcher(std::make_shared<ImageFetcher>(bed_.assembly));
    bed_.assembly.setResponseImages(std::make_shared<ResponseImages>(bed_.assembly));
  }

  void learn(const std::string& response) {
    const auto bag = bed_.assembly.bagController()->inMemoryBag();
    images().processImagesFromResponse(parseJson(response).value(), bag.get());
    bed_.fakes.timeline.runUntilIdle();
  }
  // Answers every task as soon as it is resumed: these bodies by URL, 404 for the others.
  void serve(std::map<std::string, std::string> bodies) {
    bed_.urlSession().setOnResume([bodies = std::move(bodies)](FakeURLTask& task) {
      const auto found = bodies.find(task.request().url);
      found == bodies.end() ? task.succeed(404) : task.succeed(200, found->second);
    });
  }
  void answer(const std::string& url, const std::string& body) {
    for (const auto& task : bed_.urlSession().pending()) {
      if (task->request().url == url) task->succeed(200, body);
    }
  }
  // "KEY=BYTES" of what was loaded by `limit` from now.
  std::vector<std::string> load(const std::string& descriptors, Duration limit = 1s) {
    std::vector<ImageDescriptor> wanted;
    const auto values = parseJson(descriptors).value();
    for (const auto& value : values.as_array()) {
      wanted.push_back(ImageDescriptor::of(value));
    }
    std::optional<LoadedImages> loaded;
    const auto now = bed_.fakes.timeline.realNow();
    images().loadImages(wanted, limit < Duration::zero() ? now + limit : deadlineAfter(now, limit),
                        [&](LoadedImages result) { loaded = std::move(result); });
    std::vector<std::string> texts;
    for (const auto& [key, bytes] : loaded.value()) {
      texts.push_back(key + "=" + std::string(bytes.view()));
    }
    return texts;
  }
  std::vector<std::string> fetched() {
    std::vector<std::string> urls;
    for (const auto& task : bed_.urlSession().tasks()) urls.push_back(task->request().url);
    return urls;
  }
  ResponseImages& images() { return *bed_.assembly.responseImages(); }

  QueryBed bed_;
};

TEST_F(ResponseImagesTest, WithoutABagNothingIsLearntOrLoaded) {
  learn(R"({"icon":{"url":"https://img.example/a"}})");
  EXPECT_THAT(load(R"([{"url":"https://img.example/a"}])"), IsEmpty());
  bed_.installBag(kImagesBag);
  serve({});
  load(R"([{"url":"https://img.example/a"}])");
  EXPECT_THAT(fetched(), IsEmpty());
}

TEST_F(ResponseImagesTest, TrustsTheBagsHostsWhileNoResponseHasNamedAny) {
  constexpr const char* kWanted = R"([{"url":"https://res.example/r"},
      {"url":"https://next.example/n"},{"url":"https://search.example/s?q=text"}])";
  bed_.installBag(kImagesBag);
  serve({});
  load("[]");
  load(kWanted);
  EXPECT_THAT(fetched(), ElementsAre("https://res.example/r", "https://search.example/s?q=text"));
  EXPECT_TRUE(bed_.fakes.log.contains("loadImage with invalid host: https://next.example/n"));

  // The hosts of the bag are learnt with that.
  bed_.urlSession().forgetTasks();
  learn(R"({"icon":{"url":"https://next.example/"}})");
  load(kWanted);
  EXPECT_EQ(fetched().size(), 3u);
}

TEST_F(ResponseImagesTest, LearntHostsReplaceTheBagsAndOnlyTheyAreAsked) {
  bed_.installBag(kImagesBag);
  serve({});
  learn(R"([{"results":[{"icon":[{"url":"https://IMG.example:444/x"},{"id":"far"}]}]}])");
  load(R"([
      {"url":"https://img.example/good"}, {"id":"far"}, {"url":"HTTPS://img.example./dot"},
      {"url":"https://search.example/s"}, {"url":"https://img.example.evil.example/a"},
      {"url":"https://evil.example/#@img.example/"}, {"url":"https://evil.example?@img.example/"},
      {"url":"https://img.example@evil.example/"}, {"url":"https://evil.example\\@img.example/"},
      {"url":"https://evil.example\u0000.img.example/"}, {"url":"https://evil.example%2f.img.example/"},
      {"url":"ftp://img.example/?secret"}, {"url":"file://img.example/a"}, {"url":"data:,a"}])");
  EXPECT_THAT(fetched(), ElementsAre("https://img.example/good", "https://far.example/f",
                                     "HTTPS://img.example./dot"));
  EXPECT_TRUE(
      bed_.fakes.log.contains("loadImage with invalid scheme: ftp://img.example/?<private>"));
  EXPECT_TRUE(bed_.fakes.log.contains("loadImage with invalid host: https://search.example/s"));
}

TEST_F(ResponseImagesTest, FollowsRedirectsToKnownHostsOnly) {
  bed_.installBag(kImagesBag);
  learn(R"({"icon":[{"url":"https://img.example/"},{"id":"far"}]})");
  load(R"([{"url":"https://img.example/a"}])", 0s);
  const auto request = bed_.urlSession().tasks().at(0)->request();
  EXPECT_EQ(request.timeout, 5s);
  for (const auto& [url, accepted] : {std::pair{"https://img.example/b", true},
                                      {"https://far.example/", true},
                                      {"https://evil.example/", false},
                                      {"ftp://img.example/", false},
                                      {"https://img.example@evil.example/", false},
                                      {"nonsense", false}}) {
    EXPECT_EQ(request.acceptsRedirect(url), accepted) << url;
  }
}

TEST_F(ResponseImagesTest, FilesAnImageUnderItsURLElseItsIdentifier) {
  bed_.installBag(kImagesBag);
  learn(R"({"icon":{"id":"pin"}})");
  const std::map<std::string, std::string> bodies = {{"https://img.example/a", "A"},
                                                     {"https://img.example/pin", "P"},
                                                     {"https://img.example/empty", ""}};
  const std::pair<const char*, std::vector<std::string>> cases[] = {
      {R"([{"url":"https://img.example/a","id":"pin"}])", {"https://img.example/a=A"}},
      {R"([{"url":"https://img.example/none","id":"pin"}])", {"pin=P"}},
      {R"([{"url":"https://img.example/empty","id":"pin"}])", {"pin=P"}},
      {R"([{"url":"https://evil.example/","id":"pin"}])", {"pin=P"}},
      {R"([{"url":"not a url","id":"pin"}])", {"pin=P"}},
      {R"([{"id":"pin"},{"id":"unknown"},{},{"url":"https://img.example/none"}])", {"pin=P"}},
      {R"([{"id":"a"},{"url":"https://img.example/a","id":"a"},{"id":"a"}])",
       {"a=A", "https://img.example/a=A"}},
  };
  for (const auto& [descriptors, expected] : cases) {
    SCOPED_TRACE(descriptors);
    serve(bodies);
    EXPECT_EQ(load(descriptors), expected);
  }
  EXPECT_TRUE(
      bed_.fakes.log.contains("mapping image url https://img.example/a to 1 bytes of data"));
  EXPECT_TRUE(bed_.fakes.log.contains("mapping image id pin to 1 bytes of data"));
}

TEST_F(ResponseImagesTest, AnswersAtTheDeadlineAndKeepsWhatComesLater) {
  bed_.installBag(kImagesBag);
  learn(R"({"icon":{"id":"pin"}})");
  constexpr const char* kWanted =
      R"([{"url":"https://img.example/a"},{"url":"https://img.example/b"}])";
  auto& queue = bed_.fakes.timeline.global(QualityOfService::Default);
  const auto soon = queue.after(100ms, [&] { answer("https://img.example/a", "A"); });
  const auto late = queue.after(400ms, [&] { answer("https://img.example/b", "B"); });
  const auto begin = bed_.fakes.timeline.now();
  EXPECT_THAT(load(kWanted, 300ms), ElementsAre("https://img.example/a=A"));
  EXPECT_EQ(bed_.fakes.timeline.now() - begin, 300ms);

  bed_.fakes.timeline.advance(200ms);
  for (const auto limit : {Duration::zero(), Duration(-1s), Duration::max()}) {
    EXPECT_THAT(load(kWanted, limit),
                ElementsAre("https://img.example/a=A", "https://img.example/b=B"));
  }
  EXPECT_EQ(bed_.fakes.timeline.now() - begin, 500ms);
  EXPECT_EQ(fetched().size(), 2u);
}

TEST_F(ResponseImagesTest, WaitsNoLongerThanTheSlowestFetch) {
  bed_.installBag(kImagesBag);
  learn(R"({"icon":{"id":"pin"}})");
  const auto failure = bed_.fakes.timeline.global(QualityOfService::Default).after(2s, [&] {
    for (const auto& task : bed_.urlSession().pending()) {
      task->fail(urlError(URLErrorCode::TimedOut));
    }
  });
  const auto begin = bed_.fakes.timeline.now();
  EXPECT_THAT(load(R"([{"url":"https://img.example/a"},{"id":"pin"}])", Duration::max()),
              IsEmpty());
  EXPECT_EQ(bed_.fakes.timeline.now() - begin, 2s);
}

TEST_F(ResponseImagesTest, HoldsNoMoreThanSeveralAnswersHold) {
  bed_.installBag(kImagesBag);
  learn(R"({"icon":{"id":"pin"}})");
  const std::string large(8u << 20, 'x');
  std::map<std::string, std::string> bodies;
  json::array wanted;
  for (int i = 0; i < 20; ++i) {
    const auto url = "https://img.example/" + std::to_string(i);
    bodies.emplace(url, large);
    wanted.push_back(json::object{{"url", url}});
  }
  bodies["https://img.example/small"] = "S";
  wanted.push_back(json::object{{"url", "https://img.example/small"}});
  serve(std::move(bodies));
  EXPECT_EQ(load(json::serialize(wanted), 10s).size(), 16u);
  EXPECT_EQ(fetched().size(), 21u);
}

}  // namespace
}  // namespace zelkord
