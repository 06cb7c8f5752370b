#include "zelkord/query/LookupFlow.h"

#include <algorithm>

#include "halvane/DaemonFeedback.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/context/HeaderJson.h"
#include "zelkord/query/NetworkRecords.h"
#include "zelkord/resources/LookupFilter.h"

namespace zelkord {
namespace {

constexpr std::uint32_t kLookupTrigger = 11;
constexpr std::uint32_t kLastSelectionType = 2;
constexpr Duration kRenderingTime = 500ms;

}  // namespace

std::shared_ptr<const HVFeedback> LookupFlow::_makeStart(const URLRequest& request) const {
  auto start = std::make_shared<ZLKLookupStartNetworkSearchFeedback>();
  fillStart(*start, request, _origin(kLookupTrigger));
  const auto type = _as<ZLKLookupRequest>().lookupSelectionType;
  start->lookupSelectionType = type > kLastSelectionType ? 0 : static_cast<std::int32_t>(type);
  return start;
}

std::optional<SteadyTime> LookupFlow::_deadline(const ZLKBag* bag) const {
  return lookupDeadline(assembly_.platform().clock.now(),
                        bag ? bag->searchRenderTimeout() : std::nullopt);
}

// A body of which nothing is dropped goes on byte for byte.
void LookupFlow::_filter(Body& body) const {
  const auto* filter = assembly_.lookup();
  if (!filter || !body.parsed) return;
  if (!filter->filterLookupResultsWithRequest(_as<ZLKLookupRequest>(), *body.parsed)) return;
  auto text = headerJson(*body.parsed);
  body.data = Data(text ? *std::move(text) : json::serialize(*body.parsed));
}

std::optional<SteadyTime> lookupDeadline(SteadyTime now, std::optional<Duration> renderTimeout) {
  if (!renderTimeout) return std::nullopt;
  const auto left = std::max(*renderTimeout, Duration::zero()) - kRenderingTime;
  return left < Duration::zero() ? now + left : deadlineAfter(now, left);
}

}  // namespace zelkord
