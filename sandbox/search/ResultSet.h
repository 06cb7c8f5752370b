#pragma once

#include <boost/json/array.hpp>
#include <boost/json/object.hpp>
#include <chrono>
#include <string>
#include <string_view>
#include <vector>

#include "sandbox/search/Match.h"
#include "sandbox/search/ResultWriter.h"
#include "sandbox/search/SuggestionIndex.h"

namespace sandbox {

// What one result set says about itself.
struct ResultSetHead {
  std::string query;  // the completed query that the results are for
  double completionScore = 0;
  std::chrono::seconds maxAge{0};
};

// {"status", "query", "completion_score", "max_age", "fbq", "partial_client_ip", "results"}
boost::json::object resultSet(const ResultSetHead& head, boost::json::array results);

// The matches as results; the first one brings its card along as "inline_card".
boost::json::array resultsOf(SuggestionIndex& index, const ResultWriter& writer,
                             const std::vector<Match>& matches);

// Stamps "duration" (ms since `start`) on every set.
void stampDuration(boost::json::array& sets, std::chrono::steady_clock::time_point start);

}  // namespace sandbox
