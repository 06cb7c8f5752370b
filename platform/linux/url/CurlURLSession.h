#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>

#include "platform/api/URLSession.h"
#include "platform/linux/loop/Loop.h"
#include "platform/linux/url/CurlPartitions.h"
#include "platform/linux/url/CurlSettings.h"
#include "platform/linux/url/DelegateQueue.h"
#include "platform/linux/url/ProxyConfiguration.h"
#include "platform/linux/url/TransferLine.h"

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
    std::shared_ptr<Loop> loop;
    std::shared_ptr<TransferLine> line;
    std::function<std::uint64_t()> maximumResponseSize;
    std::shared_ptr<const ProxyConfigurationSource> proxies;  // may be null
  };

  // `identityHeader` empty: all requests are nobody's.
  CurlURLSession(Services services, CurlSettings settings, std::string identityHeader,
                 std::shared_ptr<DelegateQueue> delegateQueue);
  ~CurlURLSession() override;

  // URLSession
  std::shared_ptr<URLTask> dataTask(URLRequest request, URLCompletion completion) override;
  std::shared_ptr<URLTask> downloadTask(URLRequest request, URLCompletion completion) override;
  URLCache* cache() override { return nullptr; }
  void purgeMemoryCache() override {}
  void endIdentity(const std::string& identity) override;

  // How many identities have ended.
  std::uint64_t endings() const { return endings_; }
  // A task that counts as made when so many had.
  std::shared_ptr<URLTask> dataTask(URLRequest request, URLCompletion completion,
                                    std::uint64_t endings);

  // For its tasks.
  void begin(const std::shared_ptr<CurlURLTask>& task);
  void cancel(const std::shared_ptr<CurlURLTask>& task);
  std::uint64_t maximumResponseSize() const { return services_.maximumResponseSize(); }
  std::shared_ptr<const ProxyConfiguration> proxyConfiguration() const;

 private:
  // Fixed after construction.
  const Services services_;
  const std::shared_ptr<DelegateQueue> delegateQueue_;
  const std::string identityHeader_;
  const std::shared_ptr<CurlPartitions> partitions_;

  std::atomic<std::uint64_t> endings_ = 0;  // of identities
};

}  // namespace zelkord
