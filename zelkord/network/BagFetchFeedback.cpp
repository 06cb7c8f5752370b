#include "zelkord/network/BagFetchFeedback.h"

#include "zelkord/assembly/Assembly.h"
#include "zelkord/feedback/UserGUIDSource.h"
#include "zelkord/network/NetworkTiming.h"

namespace zelkord {
namespace {

constexpr std::uint32_t kBagFetchTriggerEvent = 16;
constexpr std::int32_t kBagFetchEndpoint = 10;

std::shared_ptr<const HVStartNetworkSearchFeedback> bagFetchStart(const URLRequest& request) {
  auto start = std::make_shared<HVStartNetworkSearchFeedback>();
  start->url = request.url;
  start->headers = request.headers;
  start->triggerEvent = kBagFetchTriggerEvent;
  start->endpoint = kBagFetchEndpoint;
  return start;
}

}  // namespace

BagFetchFeedback::BagFetchFeedback(const Assembly& assembly, const URLRequest& request,
                                   std::optional<std::string> userAgent)
    : userAgent_(std::move(userAgent)), start_(bagFetchStart(request)) {
  if (auto* guids = assembly.guidController()) userGuid_ = guids->currentUserGUID();
  if (auto* sessions = assembly.feedbackSessions())
    session_ = sessions->makeSession(_record(start_));
}

void BagFetchFeedback::recordEnd(const URLResult& result, const TimingData& timing) {
  if (!session_) return;
  auto end = std::make_shared<HVEndNetworkSearchFeedback>();
  end->startSearch = start_;
  end->responseSize = static_cast<std::int64_t>(result.dataLength());
  end->statusCode = result.status();
  end->networkTimingData = networkTimingData(timing);
  session_->addFeedback(_record(std::move(end)));
}

void BagFetchFeedback::recordError(const Error& error) {
  if (session_) session_->addFeedback(_record(std::make_shared<HVErrorFeedback>(error)));
}

void BagFetchFeedback::sessionComplete() {
  if (session_) session_->sessionComplete();
}

ZelkorFeedback BagFetchFeedback::_record(std::shared_ptr<const HVFeedback> feedback) const {
  ZelkorFeedback record;
  record.feedback = std::move(feedback);
  record.userGuid = userGuid_;
  record.userAgent = userAgent_;
  return record;
}

}  // namespace zelkord
