#include "zelkord/query/NetworkRecords.h"

#include "zelkord/assembly/Assembly.h"
#include "zelkord/feedback/DaemonFeedback.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/feedback/UserGUIDSource.h"
#include "zelkord/network/NetworkTiming.h"
#include "zelkord/query/ClientState.h"

namespace zelkord {
namespace {

void fillEnd(HVEndNetworkSearchFeedback& end,
             const std::shared_ptr<const HVStartNetworkSearchFeedback>& start,
             const URLResult& result, const TimingData& timing) {
  end.startSearch = start;
  end.responseSize = static_cast<std::int64_t>(result.dataLength());
  end.statusCode = result.status();
  end.networkTimingData = networkTimingData(timing);
}

void readServiceFields(ZLKEndNetworkSearchFeedback& end, const json::array& entries) {
  for (const auto& entry : entries) {
    const auto* fields = entry.if_object();
    if (!fields) continue;
    if (auto status = stringIn(*fields, "status")) end.zelkorStatus = std::move(status);
    if (auto fbq = stringIn(*fields, "fbq")) end.fbq = std::move(fbq);
    if (auto address = stringIn(*fields, "partial_client_ip"))
      end.partialClientIp = std::move(address);
    if (const auto duration = numberIn(*fields, "duration")) end.zelkorDuration = duration;
  }
}

std::shared_ptr<HVEndNetworkSearchFeedback> makeEnd(const json::value* rawResponse) {
  const auto* entries = rawResponse ? rawResponse->if_array() : nullptr;
  if (!entries || entries->empty()) return std::make_shared<HVEndNetworkSearchFeedback>();
  auto end = std::make_shared<ZLKEndNetworkSearchFeedback>();
  readServiceFields(*end, *entries);
  return end;
}

}  // namespace

void fillStart(HVStartNetworkSearchFeedback& start, const URLRequest& request, std::string input,
               std::uint32_t triggerEvent, std::int32_t endpoint) {
  start.input = std::move(input);
  start.url = request.url;
  start.headers = request.headers;
  start.triggerEvent = triggerEvent;
  start.endpoint = endpoint;
}

std::shared_ptr<const HVStartNetworkSearchFeedback> startNetworkFeedback(const URLRequest& request,
                                                                         std::string input,
                                                                         std::uint32_t triggerEvent,
                                                                         std::int32_t endpoint) {
  auto start = std::make_shared<HVStartNetworkSearchFeedback>();
  fillStart(*start, request, std::move(input), triggerEvent, endpoint);
  return start;
}

void failSearchFeedback(const ClientState& state, const std::optional<Error>& error,
                        const ZLKRequest& request,
                        const std::shared_ptr<const HVStartNetworkSearchFeedback>& start,
                        const URLResult& result, const TimingData& timing) {
  if (error) {
    state.count("noconnection");
    state.record(std::make_shared<HVErrorFeedback>(*error), request, std::nullopt);
  }
  auto end = std::make_shared<HVEndNetworkSearchFeedback>();
  fillEnd(*end, start, result, timing);
  state.record(std::move(end), request, std::nullopt);
}

void endNetworkFeedback(const std::shared_ptr<ClientState>& state,
                        const std::shared_ptr<const HVStartNetworkSearchFeedback>& start,
                        const json::value* rawResponse, const URLResult& result,
                        const std::shared_ptr<URLTask>& task, std::int64_t queryId) {
  auto end = makeEnd(rawResponse);
  fillEnd(*end, start, result, task->timingData());
  const auto record = [state, queryId](std::shared_ptr<const HVFeedback> feedback) {
    const auto guid = state->guidController().currentUserGUID();
    state->sessionManager().addZelkorFeedback(
        {std::move(feedback), queryId, guid, state->userAgent(), 0});
  };
  if (!task->currentRequest().routed) {
    record(std::move(end));
    return;
  }
  task->connectionInformation([end, record](std::optional<json::object> information) {
    if (information) (*end->networkTimingData)["Morvane"] = std::move(*information);
    record(end);
  });
}

}  // namespace zelkord
