// What it costs to write 5,000 records of a busy session as the JSON text that is sent of them.
//
// Floor: Boost.JSON serialises the same values, all of them built in advance.

#include <benchmark/benchmark.h>

#include <memory>
#include <string>
#include <vector>

#include "benchmarks/QuietLog.h"
#include "halvane/DaemonFeedback.h"
#include "zelkord/encoding/FeedbackEncoding.h"

namespace zelkord {
namespace {

constexpr std::size_t kRecordsOfSession = 5'000;

using Records = std::vector<std::shared_ptr<const HVFeedback>>;

HVSearchResult benchedResult(int number) {
  HVSearchResult result;
  result.identifier = "6F9619FF-8B86-D011-B42D-" + std::to_string(100'000 + number);
  result.score = 0.25 + number / 7.0;
  result.resultType = number % 4;
  result.publiclyIndexable = true;
  result.topHit = number % 3;
  result.sectionBundleIdentifier = "com.example.section";
  result.bundleIdentifier = "com.example.application.results";
  result.fbr = "c25vdyBpbiBjYWbDqQ==";
  if (number % 3 == 0) result.localFeatures = JsonText(R"({"age":12,"opened":[1,0,1],"rate":0.5})");
  result.title = "Snow at the \"Caf\xC3\xA9\", page " + std::to_string(number);
  result.punchout = HVPunchout{{}, {}, {"https://results.example/page?q=snow"}};
  return result;
}

std::vector<HVSearchResult> benchedResults(int count) {
  std::vector<HVSearchResult> results;
  for (int i = 0; i < count; ++i) results.push_back(benchedResult(i));
  return results;
}

template <typename T, typename Fill>
std::shared_ptr<const HVFeedback> filled(const Fill& fill) {
  auto feedback = std::make_shared<T>();
  fill(*feedback);
  return feedback;
}

// What one keystroke and the look at its answer leave behind.
Records keystroke() {
  const std::string input = "snow in caf\xC3\xA9 \"blue\"";
  const std::string uuid = "6F9619FF-8B86-D011-B42D-00CF4FC964FF";
  return {
      filled<HVStartSearchFeedback>([&](auto& f) {
        f.triggerEvent = 1;
        f.input = input;
        f.uuid = uuid;
      }),
      filled<HVStartNetworkSearchFeedback>([&](auto& f) {
        f.triggerEvent = 1;
        f.input = input;
        f.uuid = uuid;
        f.headers = {{"X-Quenta-Languages", R"(["en","de"])"}, {"User-Agent", "Lanthe/3.1"}};
        f.url = "https://api.service.example/search?v=2&q=snow%20in%20caf%C3%A9&locale=en_US";
        f.endpointType = 6;
      }),
      filled<ZLKEndNetworkSearchFeedback>([&](auto& f) {
        f.responseSize = 20'480;
        f.statusCode = 200;
        f.networkTimingData =
            JsonText(R"({"domain_lookup":3.125,"connect":12.5,"tls":20.75,"request_start":21,)"
                     R"("response_start":55.5,"response_end":60.25,"protocol":"h2"})");
        f.connectionReused = true;
        f.interface = "wlan0";
        f.peerAddress = "[2001:db8::1]:443";
        f.uuid = uuid;
        f.zelkorStatus = "OK";
        f.zelkorDuration = 17.25;
      }),
      filled<HVVisibleResultsFeedback>([](auto& f) {
        f.triggerEvent = 1;
        f.results = benchedResults(8);
      }),
      filled<HVRankingFeedback>([](auto& f) {
        f.blendingDuration = 1.375;
        HVResultRanking hiding;
        hiding.hiddenResults = benchedResults(2);
        f.sections = {
            {0, {hiding, {}, {}, {}}, {}}, {0, {{}, {}, {}, {}}, {}}, {0, {{}, {}, {}, {}}, {}}};
      }),
      filled<HVVisibleSuggestionsFeedback>([](auto& f) {
        f.suggestions = std::vector<HVSuggestion>(4, {"s1", "snow white", 0.875, 1, {}});
        f.suggestionQuery = "snow";
      }),
      filled<HVResultEngagementFeedback>([](auto& f) {
        f.triggerEvent = 2;
        f.destination = 2;
        f.result = benchedResult(1);
      }),
      filled<HVCardSectionEngagementFeedback>([](auto& f) {
        f.triggerEvent = 2;
        f.actionDestination = "https://card.example/section/1";
      }),
      filled<HVErrorFeedback>([](auto& f) {
        f.error = HVError{-1001, "URLErrorDomain", "timed out"};
      }),
      filled<HVCustomFeedback>([](auto& f) {
        f.jsonFeedback = R"({"field":"street","guess":{"rank":3,"sure":0.5},"tags":["a","b"]})";
      }),
  };
}

Records benchedSession() {
  Records records;
  while (records.size() < kRecordsOfSession) {
    for (auto& record : keystroke()) records.push_back(std::move(record));
  }
  return records;
}

void BM_EncodeFeedback(benchmark::State& state) {
  const auto records = benchedSession();
  QuietLog log;
  const Logger errors(log, "benchmark");
  std::size_t bytes = 0;
  for (auto _ : state) {
    std::string text = "[";
    for (const auto& record : records) {
      text += '{';
      if (!appendMembers(*record, errors, text.size(), text)) state.SkipWithError("not JSON");
      text += "},";
    }
    text.back() = ']';
    bytes += text.size();
    benchmark::DoNotOptimize(text);
  }
  state.SetBytesProcessed(static_cast<std::int64_t>(bytes));
}
BENCHMARK(BM_EncodeFeedback)->Unit(benchmark::kMicrosecond);

void BM_SerializeFeedbackFloor(benchmark::State& state) {
  QuietLog log;
  const Logger errors(log, "benchmark");
  json::array values;
  for (const auto& record : benchedSession()) values.push_back(dictionaryOf(*record, errors));
  std::size_t bytes = 0;
  for (auto _ : state) {
    auto text = json::serialize(values);
    bytes += text.size();
    benchmark::DoNotOptimize(text);
  }
  state.SetBytesProcessed(static_cast<std::int64_t>(bytes));
}
BENCHMARK(BM_SerializeFeedbackFloor)->Unit(benchmark::kMicrosecond);

}  // namespace
}  // namespace zelkord
