#include "zelkord/query/QueryTestSupport.h"

#include "base/Json.h"
#include "zelkord/network/context/ZelkorUserGUIDController.h"

namespace zelkord {

QueryBed::QueryBed() : assembly(fakes.platform()) {
  assembly.feedbackSessions.set(std::make_shared<RecordingSessions>(true));
  const auto factory = std::make_shared<ZLKNetworkRequestFactory>(assembly);
  assembly.requestFactory.set(factory);
  factory->start();
  const auto bagController = std::make_shared<ZelkorBagController>(assembly, *factory);
  assembly.bagController.set(bagController);
  bagController->start();
  assembly.guidController.set(std::make_shared<ZelkorUserGUIDController>(assembly));
  sessions = std::make_shared<RecordingSessionManager>("zelkor", true);
  assembly.clientSessionManager.set(sessions);
  assembly.urlSession();
  fakes.timeline.runUntilIdle();
}

void QueryBed::installBag(const std::string& text) {
  auto dictionary = parseJson(text)->as_object();
  dictionary["__refresh_disabled"] = true;
  assembly.bagController()->cacheBagState(
      std::make_shared<const ZLKBag>(std::make_shared<const json::object>(std::move(dictionary)),
                                     "daemon"),
      BagOrigin::Network);
  fakes.timeline.runUntilIdle();
}

std::shared_ptr<ClientState> QueryBed::makeState(const std::string& identifier,
                                                 const std::string& userAgent) {
  auto state = std::make_shared<ClientState>(identifier, assembly);
  state->adoptUserAgent(userAgent);
  return state;
}

std::shared_ptr<QueryBed::Answer> QueryBed::search(ClientState& state, const std::string& text,
                                                   std::int64_t queryId) {
  ZLKSearchRequest request;
  request.queryId = queryId;
  request.queryString = text;
  return search(state, request);
}

std::shared_ptr<QueryBed::Answer> QueryBed::search(ClientState& state, ZLKSearchRequest request) {
  return ask(state, std::move(request));
}

std::shared_ptr<QueryBed::Answer> QueryBed::_ask(ClientState& state,
                                                 std::shared_ptr<const ZLKRequest> request) {
  auto answer = std::make_shared<Answer>();
  const auto& kind = queryKindOf(*request);
  kind.start(kind, state.shared_from_this(), std::move(request),
             [answer](std::int64_t queryId, auto reply, auto error) {
               ++answer->count;
               answer->queryId = queryId;
               answer->reply = std::move(reply);
               answer->error = std::move(error);
             });
  fakes.timeline.runUntilIdle();
  return answer;
}

std::vector<ZelkorFeedback> QueryBed::records() const { return sessions->records().all(); }

std::vector<std::string> QueryBed::recordedClasses() const {
  std::vector<std::string> classes;
  for (const auto& record : records()) classes.emplace_back(record.feedback->className());
  return classes;
}

}  // namespace zelkord
