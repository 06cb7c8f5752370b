#include "zelkord/network/exchange/NetworkSearchRecords.h"

#include "zelkord/network/exchange/NetworkTiming.h"

namespace zelkord {
namespace {

std::optional<std::string> unlessEmpty(const std::string& text) {
  return text.empty() ? std::nullopt : std::optional(text);
}

}  // namespace

void fillStart(NetworkSearchStart& start, const URLRequest& request, NetworkSearchOrigin origin) {
  start.triggerEvent = origin.triggerEvent;
  start.input = std::move(origin.input);
  start.uuid = std::move(origin.uuid);
  start.headers = {request.headers.begin(), request.headers.end()};
  start.url = request.url;
  start.endpointType = origin.endpointType;
}

std::shared_ptr<const HVStartNetworkSearchFeedback> startNetworkSearch(const URLRequest& request,
                                                                       NetworkSearchOrigin origin) {
  auto start = std::make_shared<HVStartNetworkSearchFeedback>();
  fillStart(*start, request, std::move(origin));
  return start;
}

void fillEnd(NetworkSearchEnd& end, std::optional<std::string> uuid, const URLResult& result,
             const TimingData& timing) {
  end.responseSize = static_cast<std::int64_t>(result.dataLength());
  end.statusCode = result.status();
  end.networkTimingData = JsonText(json::serialize(networkTimingData(timing)));
  end.interface = unlessEmpty(timing.interface);
  end.peerAddress = unlessEmpty(timing.peerAddress);
  if (end.peerAddress) end.connectionReused = timing.reused;
  end.uuid = std::move(uuid);
}

std::shared_ptr<HVEndNetworkSearchFeedback> endNetworkSearch(std::optional<std::string> uuid,
                                                             const URLResult& result,
                                                             const TimingData& timing) {
  auto end = std::make_shared<HVEndNetworkSearchFeedback>();
  fillEnd(*end, std::move(uuid), result, timing);
  return end;
}

}  // namespace zelkord
