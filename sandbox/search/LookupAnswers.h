#pragma once

#include <boost/json/array.hpp>
#include <boost/json/object.hpp>
#include <string_view>

#include "sandbox/search/ResultSet.h"

namespace sandbox {

// The words of a description that tell one sense from another, as weighted keywords.
boost::json::array keywordsOf(std::string_view gloss);

// Answers lookups of a selected text: one result for each sense of the word, each with instructions
// for when it fits the surrounding text, and the other entries of that name.
//
// The first sense always fits; a further one needs one of its keywords near by.
// Threading: any thread. Ownership: borrows the pool.
class LookupAnswers final {
 public:
  LookupAnswers(SuggestionIndexPool& pool, const ResultWriter& writer)
      : pool_(pool), writer_(writer) {}

  boost::json::array lookup(std::string_view selected) const;

 private:
  void _appendSenses(boost::json::array& results, const Entry& entry, double score) const;

  SuggestionIndexPool& pool_;
  const ResultWriter& writer_;
};

}  // namespace sandbox
