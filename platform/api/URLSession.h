#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "base/Json.h"
#include "platform/api/URLCache.h"
#include "platform/api/URLRequest.h"

namespace zelkord {

// One request under way. Made suspended; the session keeps it from `resume` until its completion
// has run. Threading: any thread.
class URLTask {
 public:
  virtual ~URLTask() = default;
  virtual void resume() = 0;
  // Completes with kURLErrorDomain -999, unless it has completed.
  virtual void cancel() = 0;
  // The request as it stands after redirects.
  virtual URLRequest currentRequest() const = 0;
  // Complete once the task has completed.
  virtual TimingData timingData() const = 0;
  // Sends a routed request through the network proxy service; false with `error` when that cannot
  // be. Before `resume`. Acts only on a routed request to a host that the service lists.
  virtual bool enableProxy(Error* error) = 0;
  // What the proxy's control connection knows of this task: "proxy", "protocol", "connect_time"
  // (ms); null when it was not proxied. On the session's delegate queue.
  virtual void connectionInformation(
      std::function<void(std::optional<json::object>)> completion) = 0;
};

using URLCompletion =
    std::function<void(const std::shared_ptr<URLTask>& task, const URLResult& result)>;

// Threading: any thread. Completions run one at a time on the session's own delegate queue, exactly
// once a resumed task.
class URLSession {
 public:
  virtual ~URLSession() = default;
  virtual std::shared_ptr<URLTask> dataTask(URLRequest request, URLCompletion completion) = 0;
  // Like a data task, but the body goes to a file and the URL cache is left alone.
  virtual std::shared_ptr<URLTask> downloadTask(URLRequest request, URLCompletion completion) = 0;
  // Null for a session without one.
  virtual URLCache* cache() = 0;
  // Forgets what the URL cache holds in memory; the disk part stays.
  virtual void purgeMemoryCache() = 0;
  // Nobody carries that identity any more: connections that may know of it close as soon as the
  // tasks on them have ended, TLS sessions and all answers that came under it are dropped, from
  // the disk too. Requests with it that come later leave nothing behind.
  virtual void endIdentity(const std::string& identity) = 0;
};

struct URLSessionConfiguration {
  std::string name;  // for logs and metrics
  struct Cache {
    std::uint64_t memoryBytes = 0;
    std::uint64_t diskBytes = 0;
    std::uint64_t minimumMappedBytes = 0;
  };
  std::optional<Cache> cache;  // none: no URL cache
  // The header with which requests say whose they are. Requests of two identities share no
  // connection, no TLS session, no validator and no cached answer. Empty: all are nobody's.
  std::string identityHeader;
  bool storesCookies = false;
  Duration cellularPurgeTimeout = 10s;  // idle connections on a metered network
  unsigned timingDataMask = 15;         // all
  bool pipelining = false;
  // None: the platform's default.
  std::optional<bool> tcpFastOpen;
  std::optional<bool> tlsSessionTickets;
};

class URLSessions {
 public:
  virtual ~URLSessions() = default;
  virtual std::shared_ptr<URLSession> make(const URLSessionConfiguration& configuration) = 0;
};

}  // namespace zelkord
