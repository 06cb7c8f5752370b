#include "sandbox/search/SearchAnswers.h"

#include "sandbox/core/Text.h"

namespace sandbox {

namespace json = boost::json;

namespace {

constexpr std::size_t kCompletions = 4;
constexpr std::size_t kResultsOfBest = 8;
constexpr std::size_t kResultsOfOthers = 3;
constexpr std::size_t kPageSize = 20;
constexpr std::size_t kMostMentions = 200;
constexpr std::size_t kShortestMention = 3;
constexpr std::size_t kLongestQuery = 200;
constexpr std::chrono::seconds kSearchMaxAge{300};

}  // namespace

json::array SearchAnswers::search(std::string_view typed) const {
  const auto start = std::chrono::steady_clock::now();
  auto index = pool_.borrow();
  const std::string lower = lowerCased(typed);
  const std::string folded = typed.size() > kLongestQuery ? std::string() : foldQuery(typed);
  const auto ordered = pickMixed(index->startingWith(folded), kResultsOfBest);
  json::array sets;
  for (const Match& match : pickCompletions(ordered, kCompletions)) {
    const std::string completed = lower + match.text.substr(folded.size());
    const std::size_t limit = sets.empty() ? kResultsOfBest : kResultsOfOthers;
    sets.push_back(_completionSet(*index, completed, scoreOfWeight(match.weight), limit));
  }
  if (sets.empty()) sets = _mentions(*index, lower);
  stampDuration(sets, start);
  return sets;
}

json::object SearchAnswers::_completionSet(SuggestionIndex& index, const std::string& completed,
                                           double score, std::size_t limit) const {
  auto set = resultSet(
      {completed, score, kSearchMaxAge},
      resultsOf(index, writer_, pickMixed(index.startingWith(foldQuery(completed)), limit)));
  set["more_results_url"] = writer_.moreUrl(completed, limit);
  return set;
}

// Nothing begins like this: entries that mention the words, under the query as typed.
json::array SearchAnswers::_mentions(SuggestionIndex& index, std::string_view typed) const {
  const std::string folded = foldQuery(typed);
  std::vector<Match> matches;
  if (folded.size() >= kShortestMention && typed.size() <= kLongestQuery) {
    matches = pickMixed(index.mentioning(folded, kMostMentions), kResultsOfBest);
  }
  const double score = matches.empty() ? 0 : scoreOfWeight(matches.front().weight) / 2;
  json::array sets;
  sets.push_back(
      resultSet({std::string(typed), score, kSearchMaxAge}, resultsOf(index, writer_, matches)));
  return sets;
}

// The first page, of a search, is a mixture; its size is what `offset` is above whole pages.
json::array SearchAnswers::more(std::string_view query, std::size_t offset) const {
  const auto start = std::chrono::steady_clock::now();
  auto index = pool_.borrow();
  const std::size_t first = offset % kPageSize;
  const auto rest = pickAfter(index->startingWith(foldQuery(query)), first);
  const std::size_t begin = std::min(rest.size(), offset - first);
  const std::size_t end = std::min(rest.size(), begin + kPageSize);
  const std::vector<Match> page(rest.begin() + static_cast<std::ptrdiff_t>(begin),
                                rest.begin() + static_cast<std::ptrdiff_t>(end));
  auto set = resultSet({lowerCased(query), 1, kSearchMaxAge}, resultsOf(*index, writer_, page));
  if (end < rest.size()) set["more_results_url"] = writer_.moreUrl(query, offset + kPageSize);
  json::array sets;
  sets.push_back(std::move(set));
  stampDuration(sets, start);
  return sets;
}

std::optional<json::array> SearchAnswers::card(std::int64_t id) const {
  auto index = pool_.borrow();
  const auto entry = index->entry(id);
  if (!entry) return std::nullopt;
  json::array cards;
  cards.push_back(writer_.card(*entry));
  return cards;
}

}  // namespace sandbox
