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

std::uint32_t lengthOf(const std::string& text) {
  return static_cast<std::uint32_t>(utf16Length(text));
}

}  // namespace

CachedResultSet::CachedResultSet(std::string_view input, const URLRequest& request,
                                 const json::object& resultSet, std::string uuid, Data data,
                                 SteadyTime now)
    : completionScore_(static_cast<float>(numberIn(resultSet, "completion_score").value_or(0))),
      expireTime_(_expiryOf(resultSet, now)),
      uiScale_(scaleOf(request)),
      input_(lowercased(input)),
      query_(lowercased(stringIn(resultSet, "query").value_or(""))),
      uuid_(std::move(uuid)),
      data_(std::move(data)) {
  inputLength_ = lengthOf(input_);
  queryLength_ = lengthOf(query_);
}

SteadyTime CachedResultSet::_expiryOf(const json::object& resultSet, SteadyTime now) {
  const auto maxAge = numberIn(resultSet, "max_age");
  if (!maxAge || *maxAge == 0) return kNever;
  constexpr double kLongest = 1e9;  // seconds; keeps the sum in range
  return now + durationOfSeconds(std::clamp(*maxAge, -kLongest, kLongest));
}

}  // namespace zelkord
