#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "halvane/ModelFeedback.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

// The feedback about one request to the service: its start and its end. Both carry one identifier,
// by which they find each other.

// Why a request went out.
struct NetworkSearchOrigin {
  std::int32_t triggerEvent = 0;  // in vocabulary::kSearchRequestTriggers
  std::int32_t endpointType = 0;  // in vocabulary::kEndpointTypes
  std::string input = {};         // what the user typed
  std::string uuid;
};

void fillStart(NetworkSearchStart& start, const URLRequest& request, NetworkSearchOrigin origin);
std::shared_ptr<const HVStartNetworkSearchFeedback> startNetworkSearch(const URLRequest& request,
                                                                       NetworkSearchOrigin origin);

// `uuid` is the start's. What there was no connection for stays unset.
void fillEnd(NetworkSearchEnd& end, std::optional<std::string> uuid, const URLResult& result,
             const TimingData& timing);
std::shared_ptr<HVEndNetworkSearchFeedback> endNetworkSearch(std::optional<std::string> uuid,
                                                             const URLResult& result,
                                                             const TimingData& timing);

}  // namespace zelkord
