#include "zelkord/query/WarmUp.h"

#include "platform/api/RandomUUID.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/assembly/UserAgent.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/network/exchange/NetworkSearchRecords.h"
#include "zelkord/network/request/ZLKNetworkRequestFactory.h"
#include "zelkord/query/RoutingProxy.h"

namespace zelkord {
namespace {

constexpr std::int32_t kWarmTrigger = 19;
constexpr std::int32_t kWarmEndpoint = 12;

void recordWarm(Assembly& assembly, std::shared_ptr<const HVFeedback> feedback) {
  auto* manager = assembly.clientSessionManager();
  if (!manager) return;
  manager->addZelkorFeedback(
      {std::move(feedback), 0, std::nullopt, zelkordUserAgent(assembly.platform().device), 0});
}

void finishWarm(Assembly& assembly, const std::string& uuid, const URLTask& task,
                const URLResult& result) {
  assembly.log(Category::Search)
      .info("Status for warm request: ({}) error: ({})", result.status(),
            result.error ? result.error->description() : "(null)");
  recordWarm(assembly, endNetworkSearch(uuid, result, task.timingData()));
}

}  // namespace

void sendWarmRequest(Assembly& assembly, const std::string& url) {
  const auto request = assembly.requestFactory()->warmRequest(url);
  if (!request) return;
  const auto uuid = randomUUID(assembly.platform().random).string();
  recordWarm(assembly, startNetworkSearch(*request, {.triggerEvent = kWarmTrigger,
                                                     .endpointType = kWarmEndpoint,
                                                     .uuid = uuid}));
  const auto task = assembly.urlSession().dataTask(
      *request, [&assembly, uuid](const auto& finished, const URLResult& result) {
        finishWarm(assembly, uuid, *finished, result);
      });
  useRoutingProxy(assembly, *task);
  task->resume();
}

}  // namespace zelkord
