#include "zelkord/query/WarmUp.h"

#include "zelkord/assembly/Assembly.h"
#include "zelkord/feedback/SessionManager.h"
#include "zelkord/network/NetworkTiming.h"
#include "zelkord/network/UserAgent.h"
#include "zelkord/network/ZLKNetworkRequestFactory.h"
#include "zelkord/query/NetworkRecords.h"
#include "zelkord/query/RoutingProxy.h"

namespace zelkord {
namespace {

constexpr std::uint32_t kWarmTrigger = 19;
constexpr std::int32_t kWarmEndpoint = 12;

void recordWarm(Assembly& assembly, std::shared_ptr<const HVFeedback> feedback) {
  auto* manager = assembly.clientSessionManager();
  if (!manager) return;
  manager->addZelkorFeedback(
      {std::move(feedback), 0, std::nullopt, zelkordUserAgent(assembly.platform().device), 0});
}

void finishWarm(Assembly& assembly,
                const std::shared_ptr<const HVStartNetworkSearchFeedback>& start,
                const URLTask& task, const URLResult& result) {
  assembly.log(Category::Search)
      .info("Status for warm request: ({}) error: ({})", result.status(),
            result.error ? result.error->description() : "(null)");
  auto end = std::make_shared<HVEndNetworkSearchFeedback>();
  end->startSearch = start;
  end->responseSize = static_cast<std::int64_t>(result.dataLength());
  end->statusCode = result.status();
  end->networkTimingData = networkTimingData(task.timingData());
  recordWarm(assembly, std::move(end));
}

}  // namespace

void sendWarmRequest(Assembly& assembly, const std::string& url) {
  const auto request = assembly.requestFactory()->warmRequest(url);
  if (!request) return;
  const auto start = startNetworkFeedback(*request, "", kWarmTrigger, kWarmEndpoint);
  recordWarm(assembly, start);
  const auto task = assembly.urlSession().dataTask(
      *request, [&assembly, start](const auto& finished, const URLResult& result) {
        finishWarm(assembly, start, *finished, result);
      });
  useRoutingProxy(assembly, *task);
  task->resume();
}

}  // namespace zelkord
