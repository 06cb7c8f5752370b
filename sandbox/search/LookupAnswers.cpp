#include "sandbox/search/LookupAnswers.h"

#include <boost/json/parse.hpp>
#include <set>

#include "sandbox/core/Text.h"

namespace sandbox {

namespace json = boost::json;

namespace {

constexpr std::size_t kLookupResults = 6;
constexpr std::size_t kShortestKeyword = 4;
constexpr std::size_t kMostKeywords = 12;
constexpr std::chrono::seconds kLookupMaxAge{3600};

// `certain`: fits whatever surrounds the word.
json::object instructionsFor(std::string_view title, std::string_view gloss, bool certain) {
  return {{"keywords", keywordsOf(gloss)},
          {"min_keywords_score", certain ? 0.0 : 1.0},
          {"completion", ""},
          {"min_subject_score", 0.0},
          {"subject", std::string(title) + " " + std::string(gloss)}};
}

std::string_view textOf(const json::object& fact, std::string_view name) {
  const auto* value = fact.if_contains(name);
  return value != nullptr && value->is_string() ? std::string_view(value->get_string())
                                                : std::string_view();
}

}  // namespace

json::array keywordsOf(std::string_view gloss) {
  std::set<std::string> seen;
  json::array keywords;
  std::string word;
  const std::string folded = foldTerm(gloss.substr(0, gloss.find("; \""))) + " ";
  for (const char c : folded) {
    if ((c >= 'a' && c <= 'z') || static_cast<unsigned char>(c) >= 0x80) {
      word.push_back(c);
      continue;
    }
    if (word.size() >= kShortestKeyword && keywords.size() < kMostKeywords &&
        seen.insert(word).second) {
      keywords.push_back(json::object{{"word", word}, {"weight", 1.0}});
    }
    word.clear();
  }
  return keywords;
}

json::array LookupAnswers::lookup(std::string_view selected) const {
  const auto start = std::chrono::steady_clock::now();
  auto index = pool_.borrow();
  json::array results;
  for (const Match& match : pickMixed(index->named(foldTerm(selected)), kLookupResults)) {
    const auto entry = index->entry(match.entry);
    if (!entry) continue;
    const double score = scoreOfWeight(match.weight);
    if (entry->kind == Kind::Word)
      _appendSenses(results, *entry, score);
    else
      results.push_back(writer_.result(*entry, score));
  }
  const double score = results.empty() ? 0.0 : 1.0;
  json::array sets;
  sets.push_back(resultSet({lowerCased(selected), score, kLookupMaxAge}, std::move(results)));
  stampDuration(sets, start);
  return sets;
}

void LookupAnswers::_appendSenses(json::array& results, const Entry& entry, double score) const {
  boost::system::error_code error;
  const json::value senses = json::parse(entry.facts, error);
  if (error || !senses.is_array()) return;
  for (const auto& sense : senses.get_array()) {
    if (!sense.is_object()) continue;
    const std::string_view gloss = textOf(sense.get_object(), "value");
    json::object result = writer_.result(entry, score);
    result["description"] =
        std::string(textOf(sense.get_object(), "label")) + " · " + std::string(gloss);
    result["lookup_instructions"] =
        instructionsFor(entry.title, gloss, &sense == senses.get_array().data());
    results.push_back(std::move(result));
    score *= 0.8;
  }
}

}  // namespace sandbox
