#pragma once

#include <boost/json/array.hpp>
#include <string>
#include <string_view>
#include <vector>

#include "sandbox/search/ResultSet.h"

namespace sandbox {

// What to look for at that hour of the day (0 to 23), most fitting first. Names are folded.
std::vector<std::string_view> popularAt(int hour);

// Suggestions before anything is typed.
//
// Threading: any thread. Ownership: borrows the pool. Errors: an unknown country is left out.
class PopularAnswers final {
 public:
  PopularAnswers(SuggestionIndexPool& pool, const ResultWriter& writer)
      : pool_(pool), writer_(writer) {}

  // One set with an empty query: popular things of the hour, and the country itself.
  boost::json::array zeroKeyword(std::string_view countryCode, int hour) const;

 private:
  SuggestionIndexPool& pool_;
  const ResultWriter& writer_;
};

}  // namespace sandbox
