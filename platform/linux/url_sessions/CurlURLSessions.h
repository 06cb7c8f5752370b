#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "base/Mutex.h"
#include "platform/api/Clock.h"
#include "platform/api/Log.h"
#include "platform/api/URLSession.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/loop/Loop.h"
#include "platform/linux/url/ProxyConfiguration.h"
#include "platform/linux/url/TransferLimits.h"
#include "platform/linux/url/TransferLine.h"

namespace zelkord {

class LinuxURLCache;

// URL loading with libcurl: HTTP/1.1 and HTTP/2, all sessions on one loop that starts with
// the first task. A session's connections are its own and stay open for the next request.
//
// Each request is sent with what it says and nothing more than Host, Accept, Accept-Encoding: gzip
// and the length of its body, save what the URL cache asks. Neither cookies nor the environment's
// proxies are used.
//
// Threading: any thread.
// Ownership: `queues` outlives it and its sessions. Its end ends the tasks under way with -999, and
// the sessions start no others.
// Errors: of kURLErrorDomain, in the result of each task.
class CurlURLSessions final : public URLSessions {
 public:
  struct Services {
    // The most bytes of a decoded body; asked when a task is resumed.
    std::function<std::uint64_t()> maximumResponseSize = [] { return std::uint64_t{8388608}; };
    // Whether data costs money at the moment. Any thread, cheap.
    std::function<bool()> isMetered = [] { return false; };
    std::shared_ptr<const ProxyConfigurationSource> proxies;  // null: there is no such service
    // Who leads the loop and carries answers to their end; null: a thread of its own, and answers
    // go to workers.
    LoopCrew* crew = nullptr;
    TransferLimits limits = TransferLimits::ofProcess();
    LimitReports* reports = nullptr;  // outlives the sessions; null: refusals are not counted
    // PEM file with the trusted roots; empty: the system's.
    std::string rootsFile;
    // What sessions with a URL cache need for it; none: they have none. The clock and the log
    // outlive the sessions, the folder is the cache's own.
    struct CacheHost {
      const Clock& clock;
      LogSink& log;
      std::string folder;
    };
    std::optional<CacheHost> cache;
  };

  CurlURLSessions(WorkQueues& queues, Services services);
  ~CurlURLSessions() override;
  CurlURLSessions(const CurlURLSessions&) = delete;
  CurlURLSessions& operator=(const CurlURLSessions&) = delete;

  // URLSessions
  std::shared_ptr<URLSession> make(const URLSessionConfiguration& configuration) override;

  // The roots file that SSL_CERT_FILE names; empty when it names none.
  static std::string rootsFileOfEnvironment();

 private:
  // The same for all sessions: two caches in one folder would be in each other's way.
  std::shared_ptr<LinuxURLCache> _cache(const URLSessionConfiguration::Cache& limits);

  // Fixed after construction.
  WorkQueues& queues_;
  const Services services_;
  const bool kernelHasFastOpen_;
  const std::shared_ptr<Loop> loop_;
  const std::shared_ptr<TransferLine> line_;

  Mutex mutex_;
  std::weak_ptr<LinuxURLCache> cache_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
