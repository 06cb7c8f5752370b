#include "zelkord/query/CachedResultSet.h"

#include <algorithm>
#include <charconv>

#include "base/Text.h"

namespace zelkord {
namespace {

double scaleOf(const URLRequest& request) {
  const auto header = request.header("X-Quenta-UI-Scale");
  double scale = 0;
  if (header) std::from_chars(header->data(), header->data() + header->size(), scale);
  return scale;
}

std::optional<SteadyTime> expiryOf(const json::object& resultSet, SteadyTime now) {
  const auto maxAge = numberIn(resultSet, "max_age");
  if (!maxAge || *maxAge == 0) return std::nullopt;
  constexpr double kLongest = 1e9;  // seconds; keeps the sum in range
  return now + durationOfSeconds(std::clamp(*maxAge, -kLongest, kLongest));
}

}  // namespace

CachedResultSet::CachedResultSet(std::string_view input, const URLRequest& request,
                                 const json::object& resultSet, std::string uuid, Data data,
                                 SteadyTime now)
    : completionScore_(static_cast<float>(numberIn(resultSet, "completion_score").value_or(0))),
      input_(lowercased(input)),
      inputLength_(utf16Length(input_)),
      query_(lowercased(stringIn(resultSet, "query").value_or(""))),
      queryLength_(utf16Length(query_)),
      expireTime_(expiryOf(resultSet, now)),
      uuid_(std::move(uuid)),
      uiScale_(scaleOf(request)),
      data_(std::move(data)) {}

}  // namespace zelkord
