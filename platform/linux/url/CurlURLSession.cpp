#include "platform/linux/url/CurlURLSession.h"

#include <utility>
#include <vector>

#include "base/Error.h"
#include "platform/linux/url/CurlURLTask.h"
#include "platform/linux/url/DownloadedFile.h"

namespace zelkord {

CurlURLSession::CurlURLSession(Services services, CurlSettings settings,
                               std::shared_ptr<DelegateQueue> delegateQueue)
    : services_(std::move(services)),
      delegateQueue_(std::move(delegateQueue)),
      connections_(std::make_shared<CurlConnections>(*services_.loop, std::move(settings))) {}

CurlURLSession::~CurlURLSession() {
  delegateQueue_->close();
  // What the completions hold ends here, not on the I/O thread.
  std::vector<std::shared_ptr<CurlURLTask>> dropped;
  services_.loop->sync([&] { dropped = connections_->close(); });
}

std::shared_ptr<URLTask> CurlURLSession::dataTask(URLRequest request, URLCompletion completion) {
  return std::make_shared<CurlURLTask>(weak_from_this(), delegateQueue_, std::move(request),
                                       std::move(completion));
}

std::shared_ptr<URLTask> CurlURLSession::downloadTask(URLRequest request,
                                                      URLCompletion completion) {
  return dataTask(std::move(request), [completion = std::move(completion)](
                                          const std::shared_ptr<URLTask>& task, URLResult result) {
    const auto file = moveBodyToFile(result);
    completion(task, result);
  });
}

// Posted tasks hold the connections, which know when they are closed: the session may be gone.
void CurlURLSession::begin(const std::shared_ptr<CurlURLTask>& task) {
  const bool posted =
      services_.loop->post([connections = connections_, task] { connections->begin(task); });
  if (!posted) task->finish({.error = urlError(URLErrorCode::Cancelled, "loading has ended")});
}

void CurlURLSession::cancel(const std::shared_ptr<CurlURLTask>& task) {
  services_.loop->post([connections = connections_, task] { connections->cancel(*task); });
}

std::shared_ptr<const ProxyConfiguration> CurlURLSession::proxyConfiguration() const {
  return services_.proxies ? services_.proxies->proxyConfiguration() : nullptr;
}

}  // namespace zelkord
