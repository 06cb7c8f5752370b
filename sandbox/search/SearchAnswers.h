#pragma once

#include <boost/json/array.hpp>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "sandbox/search/ResultSet.h"

namespace sandbox {

// Answers what a person types, page by page, and gives the card of a result.
//
// Threading: any thread. Ownership: borrows the pool. Errors: what nothing matches gets a set
// without results.
class SearchAnswers final {
 public:
  SearchAnswers(SuggestionIndexPool& pool, const ResultWriter& writer)
      : pool_(pool), writer_(writer) {}

  // Result sets for the best completions of `typed`, the best one first. Every "query" begins with
  // `typed`, lower-cased.
  boost::json::array search(std::string_view typed) const;

  // One set with the results for `query` from `offset` on. Pages from the offset that a search
  // names neither repeat its results nor each other's.
  boost::json::array more(std::string_view query, std::size_t offset) const;

  // [card], or nothing for an unknown number.
  std::optional<boost::json::array> card(std::int64_t entry) const;

 private:
  boost::json::object _completionSet(SuggestionIndex& index, const std::string& completed,
                                     double score, std::size_t limit) const;
  boost::json::array _mentions(SuggestionIndex& index, std::string_view typed) const;

  SuggestionIndexPool& pool_;
  const ResultWriter& writer_;
};

}  // namespace sandbox
