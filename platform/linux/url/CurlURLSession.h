#pragma once

#include <cstdint>
#include <functional>
#include <memory>

#include "platform/api/URLSession.h"
#include "platform/linux/url/CurlConnections.h"
#include "platform/linux/url/CurlSettings.h"
#include "platform/linux/url/DelegateQueue.h"
#include "platform/linux/url/IOLoop.h"
#include "platform/linux/url/ProxyConfiguration.h"

namespace zelkord {

// A session that loads from the network through libcurl. It caches nothing: a session with a URL
// cache is another URLSession in front of this one.
//
// Threading: any thread. Ownership: shares the loop with the other sessions; its end drops the
// tasks under way, whose completions then never run, and closes the delegate queue.
class CurlURLSession final : public URLSession,
                             public std::enable_shared_from_this<CurlURLSession> {
 public:
  struct Services {
    std::shared_ptr<IOLoop> loop;
    std::function<std::uint64_t()> maximumResponseSize;
    std::shared_ptr<const ProxyConfigurationSource> proxies;  // may be null
  };

  CurlURLSession(Services services, CurlSettings settings,
                 std::shared_ptr<DelegateQueue> delegateQueue);
  ~CurlURLSession() override;

  // URLSession
  std::shared_ptr<URLTask> dataTask(URLRequest request, URLCompletion completion) override;
  std::shared_ptr<URLTask> downloadTask(URLRequest request, URLCompletion completion) override;
  URLCache* cache() override { return nullptr; }
  void purgeMemoryCache() override {}

  // For its tasks.
  void begin(const std::shared_ptr<CurlURLTask>& task);
  void cancel(const std::shared_ptr<CurlURLTask>& task);
  std::uint64_t maximumResponseSize() const { return services_.maximumResponseSize(); }
  std::shared_ptr<const ProxyConfiguration> proxyConfiguration() const;

 private:
  // Fixed after construction.
  const Services services_;
  const std::shared_ptr<DelegateQueue> delegateQueue_;
  const std::shared_ptr<CurlConnections> connections_;
};

}  // namespace zelkord
