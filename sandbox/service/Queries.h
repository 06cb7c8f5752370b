#pragma once

#include <boost/json/array.hpp>
#include <string>

#include "sandbox/http/Message.h"
#include "sandbox/search/AnswerCache.h"
#include "sandbox/search/LookupAnswers.h"
#include "sandbox/search/PopularAnswers.h"
#include "sandbox/search/SearchAnswers.h"

namespace sandbox {

// A body of about `bytes` made of `sets` and a "pad" text in the first one. `sets` is the JSON text
// of a list that begins with an object.
std::string padded(const std::string& sets, std::size_t bytes);

// Answers search, more-results, card and related requests, from the cache when the same was asked
// before.
//
// Threading: any thread. Ownership: borrows the pool.
class Queries final {
 public:
  Queries(SuggestionIndexPool& pool, std::string baseUrl);

  Reply search(const Request& request);
  Reply more(const Request& request);
  Reply card(const Request& request);

 private:
  boost::json::array _searchSets(const Request& request, int hour) const;
  Reply _cached(const std::string& key, const std::string& cacheControl,
                const std::function<boost::json::array()>& make);

  const ResultWriter writer_;
  const SearchAnswers search_;
  const PopularAnswers popular_;
  const LookupAnswers lookup_;
  AnswerCache cache_;
};

}  // namespace sandbox
