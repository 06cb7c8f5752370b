#include "zelkord/network/bag/BagFetchFeedback.h"

#include "platform/api/RandomUUID.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/encoding/ErrorEncoding.h"
#include "zelkord/feedback/UserGUIDSource.h"
#include "zelkord/network/exchange/NetworkSearchRecords.h"

namespace zelkord {
namespace {

constexpr std::int32_t kBagFetchTrigger = 16;
constexpr std::int32_t kBagFetchEndpoint = 10;

}  // namespace

BagFetchFeedback::BagFetchFeedback(const Assembly& assembly, const URLRequest& request,
                                   std::optional<std::string> userAgent)
    : userAgent_(std::move(userAgent)), uuid_(randomUUID(assembly.platform().random).string()) {
  if (auto* guids = assembly.guidController()) userGuid_ = guids->currentUserGUID();
  auto* sessions = assembly.feedbackSessions();
  if (!sessions) return;
  session_ = sessions->makeSession(_record(startNetworkSearch(
      request,
      {.triggerEvent = kBagFetchTrigger, .endpointType = kBagFetchEndpoint, .uuid = uuid_})));
}

void BagFetchFeedback::recordEnd(const URLResult& result, const TimingData& timing) {
  if (!session_) return;
  session_->addFeedback(_record(endNetworkSearch(uuid_, result, timing)));
}

void BagFetchFeedback::recordError(const Error& error) {
  if (!session_) return;
  session_->addFeedback(_record(std::make_shared<HVErrorFeedback>(errorRecordOf(error))));
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
