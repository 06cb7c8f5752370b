#include "zelkord/core/FeedbackReports.h"

#include <algorithm>
#include <string_view>

#include "base/Json.h"
#include "halvane/ModelFeedback.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/core/ClientQueryId.h"
#include "zelkord/encoding/ErrorEncoding.h"
#include "zelkord/feedback/FeedbackSeams.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/feedback/UserGUIDSource.h"
#include "zelkord/query/ClientState.h"
#include "zelkord/query/ErrorCodes.h"

namespace zelkord {
namespace {

// After these the user is likely to search: today view, keyboard shortcut, click on the menu, tap
// to input, new window, click, pull-down of the home screen, notification center, partial
// pull-down.
constexpr std::int32_t kWarmingEvents[] = {2, 5, 6, 9, 10, 11, 22, 23, 24};

constexpr std::int32_t kCountedEngagementType = 1;

// Clients whose engagements are donated, and the domain under which.
constexpr std::pair<std::string_view, std::string_view> kDonors[] = {{"brelin", "Brelin"},
                                                                     {"lanthe", "Lanthe"}};

bool isWarming(const HVFeedback& feedback) {
  const auto* view = feedbackAs<HVSearchViewAppearFeedback>(feedback);
  return view && !view->onLockScreen &&
         std::ranges::count(kWarmingEvents, view->triggerEvent.value) > 0;
}

std::uint64_t nanosecondsSinceBoot(const Clock& clock) {
  return static_cast<std::uint64_t>(clock.now().time_since_epoch().count());
}

}  // namespace

bool FeedbackReports::reportPayload(std::shared_ptr<HVFeedback> feedback, std::int64_t queryId,
                                    const std::shared_ptr<ClientState>& state,
                                    const Reporter& reporter) const {
  assembly_.tracing().emit(TraceCode::FeedbackStart);
  if (feedback->timestamp == 0) {
    feedback->timestamp = nanosecondsSinceBoot(assembly_.platform().clock);
  }
  bool fits = false;
  if (!state) {
    fits = _recordError("client state nil", reporter);
    assembly_.log(Category::Feedback).error("state must not be nil");
  } else if (feedback->kind() == kKindOf<HVCustomFeedback>) {
    const auto& log = assembly_.log(Category::Flusher);
    fits = handleCustomFeedback(
        std::static_pointer_cast<const HVCustomFeedback>(std::move(feedback)), queryId, *state,
        reporter, [&log] { log.notice("flushed custom feedback"); });
  } else {
    fits = _report(std::move(feedback), queryId, *state, reporter);
  }
  assembly_.tracing().emit(TraceCode::FeedbackEnd);
  return fits;
}

bool FeedbackReports::_recordError(const char* reason, const Reporter& reporter) const {
  const auto error = errorRecordOf(zelkorError(kConnectionFault, reason));
  const auto guid = assembly_.guidController()->currentUserGUID();
  return _makeSession({std::make_shared<HVErrorFeedback>(error), 0, guid,
                       zelkordUserAgent(assembly_.platform().device), 0, 0, reporter.pid,
                       reporter.call});
}

bool FeedbackReports::_makeSession(ZelkorFeedback record) const {
  const auto session = assembly_.feedbackSessions()->makeSession(std::move(record));
  if (session) session->sessionComplete();
  return session != nullptr;
}

bool FeedbackReports::_report(std::shared_ptr<const HVFeedback> feedback, std::int64_t queryId,
                              ClientState& state, const Reporter& reporter) const {
  if (isWarming(*feedback)) state.warm();
  const auto clientQueryId = clientQueryIdOf(*feedback);
  if (const auto* engagement = feedbackAs<HVResultEngagementFeedback>(*feedback)) {
    _noteEngagement(*engagement, state);
  }
  return state.sessionManager().addZelkorFeedback(
      {std::move(feedback), queryId, state.guidController().currentUserGUID(), state.userAgent(),
       clientQueryId, 0, reporter.pid, reporter.call});
}

void FeedbackReports::_noteEngagement(const HVResultEngagementFeedback& engagement,
                                      const ClientState& state) const {
  if (const auto& result = engagement.result) {
    if (result->topHit.value != 0) state.count("tophit.engagements");
    if (result->resultType.value == kCountedEngagementType) state.count("zelkor.engagements");
  }
  _donate(engagement, state);
}

void FeedbackReports::_donate(const HVResultEngagementFeedback& engagement,
                              const ClientState& state) const {
  const auto& query = engagement.completedQuery;
  if (!query || query->empty()) return;
  for (const auto& [client, domain] : kDonors) {
    if (state.clientShortName() != client) continue;
    assembly_.platform().knowledge.donate({std::string(domain), "Engagement",
                                           json::serialize(json::object{{"input", *query}}),
                                           assembly_.platform().clock.wallNow()});
  }
}

bool FeedbackReports::handleCustomFeedback(std::shared_ptr<const HVCustomFeedback> feedback,
                                           std::int64_t queryId, const ClientState& state,
                                           const Reporter& reporter,
                                           std::function<void()> callback) const {
  switch (feedback->feedbackType.value) {
    case HVCustomFeedback::kBrelinAutofill:
    case HVCustomFeedback::kLantheResultFeatures: {
      const bool fits = _makeSession({std::move(feedback), queryId, std::nullopt, state.userAgent(),
                                      0, 0, reporter.pid, reporter.call});
      if (callback) callback();
      return fits;
    }
    case HVCustomFeedback::kCrowdsourcing:
      _flush(std::move(feedback), std::move(callback));
      return true;
    default:
      return true;
  }
}

void FeedbackReports::_flush(std::shared_ptr<const HVCustomFeedback> crowdsourcing,
                             std::function<void()> callback) const {
  assembly_.reporter().addValue(1, "com.quenta.zelkord.dp.submit");
  if (!isJsonObject(crowdsourcing->jsonFeedback)) {
    assembly_.log(Category::FeedbackErrors).error("custom feedback is not a JSON object");
    assembly_.reporter().addValue(1, kFeedbackNotSent);
  } else if (auto* flusher = assembly_.crowdsourcingFeedbackFlusher()) {
    flusher->flush(std::move(crowdsourcing), std::move(callback));
  }
}

}  // namespace zelkord
