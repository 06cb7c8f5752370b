#include "sandbox/search/PopularAnswers.h"

#include <algorithm>
#include <array>

#include "sandbox/core/Text.h"

namespace sandbox {

namespace json = boost::json;

namespace {

constexpr std::chrono::seconds kPopularMaxAge{600};

// The match of that kind, when `kind` is one, with the greatest weight.
void appendBest(std::vector<Match>& picked, std::vector<Match> matches, Kind kind) {
  std::erase_if(matches, [&](const Match& match) { return match.kind != kind; });
  const auto best =
      std::max_element(matches.begin(), matches.end(),
                       [](const Match& a, const Match& b) { return a.weight < b.weight; });
  if (best != matches.end()) picked.push_back(std::move(*best));
}

}  // namespace

std::vector<std::string_view> popularAt(int hour) {
  if (hour >= 5 && hour < 11)
    return {"coffee", "breakfast", "weather", "newspaper", "train", "sunrise"};
  if (hour >= 11 && hour < 15) return {"lunch", "restaurant", "weather", "map", "market", "tea"};
  if (hour >= 15 && hour < 19) return {"traffic", "sport", "recipe", "market", "park", "library"};
  if (hour >= 19 && hour < 23) return {"film", "music", "dinner", "theater", "book", "wine"};
  return {"sleep", "moon", "star", "dream", "radio", "alarm clock"};
}

json::array PopularAnswers::zeroKeyword(std::string_view countryCode, int hour) const {
  const auto start = std::chrono::steady_clock::now();
  auto index = pool_.borrow();
  std::vector<Match> picked;
  for (const auto name : popularAt(hour)) appendBest(picked, index->named(name), Kind::Word);
  if (countryCode.size() == 2)
    appendBest(picked, index->named(foldTerm(countryCode)), Kind::Country);
  json::array sets;
  sets.push_back(resultSet({"", 0, kPopularMaxAge}, resultsOf(*index, writer_, picked)));
  stampDuration(sets, start);
  return sets;
}

}  // namespace sandbox
