#include "zelkord/query/NetworkRecords.h"

#include "halvane/DaemonFeedback.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/encoding/ErrorEncoding.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/feedback/UserGUIDSource.h"
#include "zelkord/network/exchange/NetworkSearchRecords.h"
#include "zelkord/network/exchange/NetworkTiming.h"
#include "zelkord/query/ClientState.h"

namespace zelkord {
namespace {

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

// The end record of an answer; its network part is not filled yet.
struct EndRecord {
  std::shared_ptr<HVFeedback> feedback;
  NetworkSearchEnd* network;  // part of it
};

EndRecord makeEnd(const json::value* rawResponse) {
  const auto* entries = rawResponse ? rawResponse->if_array() : nullptr;
  if (!entries || entries->empty()) {
    auto end = std::make_shared<HVEndNetworkSearchFeedback>();
    return {end, end.get()};
  }
  auto end = std::make_shared<ZLKEndNetworkSearchFeedback>();
  readServiceFields(*end, *entries);
  return {end, end.get()};
}

}  // namespace

void failSearchFeedback(const ClientState& state, const std::optional<Error>& error,
                        const ZLKRequest& request, const URLResult& result,
                        const TimingData& timing) {
  if (error) {
    state.count("noconnection");
    state.record(std::make_shared<HVErrorFeedback>(errorRecordOf(*error)), request, std::nullopt);
  }
  state.record(endNetworkSearch(request.uuid, result, timing), request, std::nullopt);
}

void endNetworkFeedback(const std::shared_ptr<ClientState>& state, const ZLKRequest& request,
                        const json::value* rawResponse, const URLResult& result,
                        const std::shared_ptr<URLTask>& task) {
  const auto end = makeEnd(rawResponse);
  const auto timing = task->timingData();
  fillEnd(*end.network, request.uuid, result, timing);
  const auto record = [state,
                       queryId = request.queryId](std::shared_ptr<const HVFeedback> feedback) {
    const auto guid = state->guidController().currentUserGUID();
    state->sessionManager().addZelkorFeedback(
        {std::move(feedback), queryId, guid, state->userAgent(), 0, 0, state->process()});
  };
  if (!task->currentRequest().routed) {
    record(end.feedback);
    return;
  }
  task->connectionInformation([end, timing, record](std::optional<json::object> information) {
    if (information) {
      auto data = networkTimingData(timing);
      data["Morvane"] = std::move(*information);
      end.network->networkTimingData = JsonText(json::serialize(data));
    }
    record(end.feedback);
  });
}

}  // namespace zelkord
