#pragma once

#include <memory>
#include <optional>
#include <string>

#include "platform/linux/queues/LinuxClock.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/url_cache/LinuxURLCache.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {

inline constexpr URLSessionConfiguration::Cache kTestCacheLimits{1 << 20, 10 << 20, 4096};

// The cache on real queues and files. `restart` ends it, which writes all, and begins another.
struct URLCacheTestBed {
  explicit URLCacheTestBed(std::string cacheFolder,
                           URLSessionConfiguration::Cache cacheLimits = kTestCacheLimits)
      : folder(std::move(cacheFolder)), limits(cacheLimits) {
    start();
  }

  void start() { cache.emplace(LinuxURLCache::Host{queues, clock, log, folder}, limits); }
  void stop() { cache.reset(); }
  void restart() {
    stop();
    start();
  }
  void store(const std::string& url, std::string body, HTTPHeaders headers = {}) {
    URLResponse response{.url = url, .status = 200, .headers = std::move(headers)};
    cache->store({.url = url}, {std::move(response), Data(std::move(body))});
  }
  // The body, or none.
  std::optional<std::string> find(const std::string& url, HTTPHeaders headers = {}) {
    const auto found = cache->lookup({.url = url, .headers = std::move(headers)});
    return found ? std::optional(std::string(found->data.view())) : std::nullopt;
  }

  const std::string folder;
  const URLSessionConfiguration::Cache limits;
  LinuxClock clock;
  LinuxWorkQueues queues{clock, 2};
  RecordingLog log;
  std::optional<LinuxURLCache> cache;
};

}  // namespace zelkord
