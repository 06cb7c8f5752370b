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

FetchedResponse::FetchedResponse(std::string_view typed, const URLRequest& request,
                                 std::string identifier, Data body, SteadyTime now,
                                 const UUID& user)
    : input(lowercased(typed)),
      inputLength(lengthOf(input)),
      uiScale(scaleOf(request)),
      uuid(std::move(identifier)),
      data(std::move(body)),
      arrival(now),
      userGuid(user) {}

CachedResultSet::CachedResultSet(std::shared_ptr<const FetchedResponse> response,
                                 const json::object& resultSet)
    : completionScore_(static_cast<float>(numberIn(resultSet, "completion_score").value_or(0))),
      inputLength_(response->inputLength),
      expireTime_(_expiryOf(resultSet, response->arrival)),
      uiScale_(response->uiScale),
      response_(std::move(response)),
      query_(lowercased(stringIn(resultSet, "query").value_or(""))) {
  queryLength_ = lengthOf(query_);
}

SteadyTime CachedResultSet::_expiryOf(const json::object& resultSet, SteadyTime now) {
  const auto maxAge = numberIn(resultSet, "max_age");
  if (!maxAge || *maxAge == 0) return kNever;
  constexpr double kLongest = 1e9;  // seconds; keeps the sum in range
  return now + durationOfSeconds(std::clamp(*maxAge, -kLongest, kLongest));
}

}  // namespace zelkord
