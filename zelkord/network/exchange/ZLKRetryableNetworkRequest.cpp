#include "zelkord/network/exchange/ZLKRetryableNetworkRequest.h"

#include <utility>

namespace zelkord {
namespace {

constexpr Duration kRetryDelay = 1500ms;

bool mayRetry(const ZLKRetryableNetworkRequest& request, unsigned retriesLeft, SteadyTime now) {
  return request.expire && now <= *request.expire && retriesLeft > 0;
}

void schedule(WorkQueue& queue, Duration delay, Task task) {
  if (delay > Duration::zero()) {
    queue.after(delay, std::move(task)).detach();
  } else {
    queue.async(std::move(task));
  }
}

}  // namespace

std::shared_ptr<URLTask> dataTaskWithRetryableRequest(
    URLSession& session, std::shared_ptr<const ZLKRetryableNetworkRequest> request,
    unsigned attempt, unsigned retriesLeft, URLCompletion completion, RetryTiming timing) {
  const auto& httpRequest = request->httpRequest;
  return session.dataTask(
      httpRequest, [&session, request, attempt, retriesLeft, completion = std::move(completion),
                    timing](const std::shared_ptr<URLTask>& task, const URLResult& result) {
        if (!result.error || !mayRetry(*request, retriesLeft, timing.clock.now())) {
          completion(task, result);
          return;
        }
        const auto again = [&session, request, attempt, retriesLeft, completion, timing] {
          dataTaskWithRetryableRequest(session, request, attempt + 1, retriesLeft - 1, completion,
                                       timing)
              ->resume();
        };
        schedule(timing.queues.global(QualityOfService::High),
                 request->delayOnFail ? kRetryDelay : Duration::zero(), again);
      });
}

std::uint64_t mach_duration_to_milliseconds(std::uint64_t ticks, MonotonicTimebase timebase) {
  if (timebase.denominator == 0) return 0;
  const std::uint64_t nanoseconds = ticks * timebase.numerator / timebase.denominator;
  return static_cast<std::uint64_t>(static_cast<double>(nanoseconds) / 1'000'000);
}

}  // namespace zelkord
