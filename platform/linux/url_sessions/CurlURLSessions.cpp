#include "platform/linux/url_sessions/CurlURLSessions.h"

#include <curl/curl.h>

#include <cstdlib>
#include <fstream>
#include <utility>

#include "base/Check.h"
#include "platform/linux/url/CurlURLSession.h"
#include "platform/linux/url_cache/CachingURLSession.h"

namespace zelkord {
namespace {

// Bit 0 of the kernel's setting: clients may use fast open.
bool readFastOpenOfKernel() {
  std::ifstream file("/proc/sys/net/ipv4/tcp_fastopen");
  unsigned bits = 0;
  return (file >> bits) && (bits & 1) != 0;
}

}  // namespace

CurlURLSessions::CurlURLSessions(WorkQueues& queues, Services services)
    : queues_(queues),
      services_(std::move(services)),
      kernelHasFastOpen_(readFastOpenOfKernel()),
      loop_(std::make_shared<Loop>("zelkord-url", services_.crew)),
      line_(std::make_shared<TransferLine>(loop_, services_.limits, services_.reports)) {
  ZK_CHECK(curl_global_init(CURL_GLOBAL_DEFAULT) == CURLE_OK, "libcurl initialises");
}

CurlURLSessions::~CurlURLSessions() { loop_->stop(); }

std::shared_ptr<URLSession> CurlURLSessions::make(const URLSessionConfiguration& configuration) {
  CurlSettings settings{.rootsFile = services_.rootsFile,
                        .multiplexes = configuration.pipelining,
                        .fastOpen = kernelHasFastOpen_ && configuration.tcpFastOpen.value_or(false),
                        .tlsSessionTickets = configuration.tlsSessionTickets,
                        .meteredIdleTime = configuration.cellularPurgeTimeout,
                        .maximumIdleConnections = services_.limits.idleConnections,
                        .isMetered = services_.isMetered};
  // All tasks end on this one queue. What ends goes before what begins, or those who ask much would
  // hold up everybody's answers.
  auto delegateQueue = std::make_shared<DelegateQueue>(
      queues_.makeSerialQueue("url." + configuration.name, QualityOfService::High));
  auto session = std::make_shared<CurlURLSession>(
      CurlURLSession::Services{loop_, line_, services_.maximumResponseSize, services_.proxies},
      std::move(settings), configuration.identityHeader, delegateQueue);
  if (!configuration.cache || !services_.cache) return session;
  return std::make_shared<CachingURLSession>(std::move(session), std::move(delegateQueue),
                                             _cache(*configuration.cache),
                                             configuration.identityHeader);
}

std::shared_ptr<LinuxURLCache> CurlURLSessions::_cache(
    const URLSessionConfiguration::Cache& limits) {
  const MutexLock lock(mutex_);
  auto cache = cache_.lock();
  if (cache) return cache;
  const auto& host = *services_.cache;
  cache = std::make_shared<LinuxURLCache>(
      LinuxURLCache::Host{queues_, host.clock, host.log, host.folder}, limits);
  cache_ = cache;
  return cache;
}

std::string CurlURLSessions::rootsFileOfEnvironment() {
  const char* file = std::getenv("SSL_CERT_FILE");
  return file ? file : "";
}

}  // namespace zelkord
