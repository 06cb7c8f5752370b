#include "platform/linux/url/CurlURLSession.h"

#include <utility>
#include <vector>

#include "base/Error.h"
#include "platform/linux/url/CurlURLTask.h"
#include "platform/linux/url/DownloadedFile.h"

namespace zelkord {

CurlURLSession::CurlURLSession(Services services, CurlSettings settings, std::string identityHeader,
                               std::shared_ptr<DelegateQueue> delegateQueue)
    : services_(std::move(services)),
      delegateQueue_(std::move(delegateQueue)),
      identityHeader_(std::move(identityHeader)),
      partitions_(std::make_shared<CurlPartitions>(*services_.loop, std::move(settings))) {}

CurlURLSession::~CurlURLSession() {
  delegateQueue_->close();
  // What the completions hold ends here, not on the loop.
  std::vector<std::shared_ptr<CurlURLTask>> dropped;
  std::vector<std::shared_ptr<CurlURLTask>> droppedInLine;
  services_.loop->sync([&] {
    droppedInLine = services_.line->leave(*partitions_);
    dropped = partitions_->close();
  });
}

std::shared_ptr<URLTask> CurlURLSession::dataTask(URLRequest request, URLCompletion completion) {
  return dataTask(std::move(request), std::move(completion), endings_);
}

std::shared_ptr<URLTask> CurlURLSession::dataTask(URLRequest request, URLCompletion completion,
                                                  std::uint64_t endings) {
  CurlURLTask::Order order{.endings = endings};
  if (!identityHeader_.empty()) order.identity = request.header(identityHeader_).value_or("");
  order.request = std::make_shared<const URLRequest>(std::move(request));
  return std::make_shared<CurlURLTask>(weak_from_this(), delegateQueue_, std::move(order),
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

// Posted tasks hold the partitions, which know when they are closed: the session may be gone.
void CurlURLSession::begin(const std::shared_ptr<CurlURLTask>& task) {
  const bool posted = services_.loop->post(
      [line = services_.line, partitions = partitions_, task] { line->enter(task, partitions); });
  if (!posted) task->finish({.error = urlError(URLErrorCode::Cancelled, "loading has ended")});
}

void CurlURLSession::cancel(const std::shared_ptr<CurlURLTask>& task) {
  services_.loop->post([line = services_.line, partitions = partitions_, task] {
    if (!line->cancel(*task)) partitions->cancel(*task);
  });
}

// Counted at once, so that no request made from now on is taken for an older one.
void CurlURLSession::endIdentity(const std::string& identity) {
  ++endings_;
  services_.loop->post([partitions = partitions_, identity] { partitions->endIdentity(identity); });
}

std::shared_ptr<const ProxyConfiguration> CurlURLSession::proxyConfiguration() const {
  return services_.proxies ? services_.proxies->proxyConfiguration() : nullptr;
}

}  // namespace zelkord
