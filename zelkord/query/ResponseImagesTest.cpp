#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "zelkord/network/exchange/ImageFetcher.h"
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
    bed_.assembly.imageFetcher.set(std::make_shared<ImageFetcher>(bed_.assembly));
    bed_.assembly.responseImages.set(std::make_shared<ResponseImages>(bed_.assembly));
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
  static std::vector<ImageDescriptor> descriptorsOf(const json::array& values) {
    std::vector<ImageDescriptor> descriptors;
    for (const auto& value : values) descriptors.push_back(ImageDescriptor::of(value));
    return descriptors;
  }
  // "KEY=BYTES" of what was loaded by `limit` from now.
  std::vector<std::string> load(const std::string& descriptors, Duration limit = 1s) {
    const auto wanted = descriptorsOf(parseJson(descriptors)->as_array());
    std::optional<LoadedImages> loaded;
    const auto now = bed_.fakes.timeline.realNow();
    const auto deadline = limit < Duration::zero() ? now + limit : deadlineAfter(now, limit);
    const auto call = images().loadImages({wanted, deadline, "pid 1"},
                                          [&](LoadedImages result) { loaded = std::move(result); });
    while (call && call->ask()) {
    }
    bed_.fakes.timeline.runUntil([&] { return loaded.has_value(); });
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

TEST_F(ResponseImagesTest, LearnsNoHostsWithoutEnd) {
  bed_.installBag(kImagesBag);
  learn(R"({"icon":{"url":"https://img.example/"}})");
  std::string icons;
  for (int i = 0; i < 100'000; ++i) icons += R"({"url":"http://h)" + std::to_string(i) + R"("},)";
  learn(R"({"icon":[)" + icons + "{}]}");
  learn(R"({"icon":{"url":"https://late.example/"}})");
  serve({});
  load(R"([{"url":"https://late.example/a"},{"url":"https://img.example/a"},{"url":"http://h1"}])");
  EXPECT_THAT(fetched(), ElementsAre("https://img.example/a", "http://h1"));
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

TEST_F(ResponseImagesTest, HoldsWhatAnAnswerHoldsFromItsBeginning) {
  bed_.installBag(kImagesBag);
  learn(R"({"icon":{"id":"pin"}})");
  const std::string large(8u << 20, 'x');
  json::array wanted;
  for (int i = 0; i < 12; ++i) {
    wanted.push_back(json::object{{"url", "https://img.example/" + std::to_string(i)}});
  }
  std::vector<std::string> keys;
  const auto call =
      images().loadImages({descriptorsOf(wanted), bed_.fakes.timeline.realNow() + 10s, "pid 1"},
                          [&](LoadedImages loaded) {
                            for (const auto& [key, bytes] : loaded) keys.push_back(key);
                          });
  EXPECT_FALSE(call->ask());
  // The last ones come first.
  for (int i = 11; i >= 0; --i) {
    answer("https://img.example/" + std::to_string(i), large);
    bed_.fakes.timeline.runUntilIdle();
  }
  ASSERT_EQ(keys.size(), 8u);
  EXPECT_EQ(keys.front(), "https://img.example/0");
  EXPECT_EQ(keys.back(), "https://img.example/7");
  EXPECT_GT(bed_.counter("com.quenta.zelkord.limit.image_bytes"), 0);
}

TEST_F(ResponseImagesTest, GivesNoAnswerAndAsksForNothingOnceItIsGivenUp) {
  bed_.installBag(kImagesBag);
  learn(R"({"icon":{"id":"pin"}})");
  json::array wanted;
  for (int i = 0; i < 100; ++i) {
    wanted.push_back(json::object{{"url", "https://img.example/" + std::to_string(i)}});
  }
  int answers = 0;
  const auto call =
      images().loadImages({descriptorsOf(wanted), bed_.fakes.timeline.realNow() + 1s, "pid 1"},
                          [&](const LoadedImages&) { ++answers; });
  EXPECT_TRUE(call->ask());
  call->giveUp();
  EXPECT_FALSE(call->ask());
  bed_.fakes.timeline.advance(60s);
  EXPECT_EQ(answers, 0);
  EXPECT_TRUE(bed_.urlSession().pending().empty());
  EXPECT_LE(fetched().size(), 16u);
}

}  // namespace
}  // namespace zelkord
