#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string>

#include "platform/api/URLSession.h"
#include "platform/api/WorkQueues.h"
#include "platform/linux/url/IOLoop.h"
#include "platform/linux/url/ProxyConfiguration.h"

namespace zelkord {

// URL loading with libcurl: HTTP/1.1 and HTTP/2, all sessions on one I/O thread that starts with
// the first task. A session's connections are its own and stay open for the next request.
//
// Each request is sent with what it says and nothing more than Host, Accept, Accept-Encoding: gzip
// and the length of its body. Neither cookies nor the environment's proxies are used.
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
    // PEM file with the trusted roots; empty: the system's.
    std::string rootsFile;
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
  // Fixed after construction.
  WorkQueues& queues_;
  const Services services_;
  const bool kernelHasFastOpen_;
  const std::shared_ptr<IOLoop> loop_ = std::make_shared<IOLoop>();
};

}  // namespace zelkord
