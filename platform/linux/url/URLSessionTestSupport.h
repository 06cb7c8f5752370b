#pragma once

#include <condition_variable>
#include <memory>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/linux/queues/LinuxClock.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/url_sessions/CurlURLSessions.h"

namespace zelkord {

// Collects what tasks end with.
class URLResults {
 public:
  URLCompletion completion();
  // Waits until that many have come; aborts the test program after 20 s.
  std::vector<URLResult> wait(std::size_t count);
  std::size_t count() const;

 private:
  mutable Mutex mutex_;
  std::condition_variable_any changed_;
  std::vector<URLResult> results_ ZK_GUARDED_BY(mutex_);
};

// The real sessions on the real queues.
struct URLSessionTestBed {
  explicit URLSessionTestBed(CurlURLSessions::Services services = {})
      : sessions(queues, withCrew(std::move(services), queues.crew())) {}

  std::shared_ptr<URLSession> make(URLSessionConfiguration configuration = {.name = "test"}) {
    return sessions.make(configuration);
  }

  static CurlURLSessions::Services withCrew(CurlURLSessions::Services services, LoopCrew& crew) {
    services.crew = &crew;
    return services;
  }

  LinuxClock clock;
  LinuxWorkQueues queues{clock, 2};
  CurlURLSessions sessions;
};

// Runs a request to its end.
struct URLOutcome {
  URLResult result;
  TimingData timing;
  URLRequest request;  // as it stands after redirects

  std::int64_t errorCode() const { return result.error ? result.error->code : 0; }
  std::string text() const { return std::string(result.data.value_or(Data()).view()); }
};
URLOutcome loadURL(URLSession& session, URLRequest request);

// A file that lives as long as the object.
class URLTestFile {
 public:
  explicit URLTestFile(const std::string& contents);
  ~URLTestFile();
  URLTestFile(const URLTestFile&) = delete;
  URLTestFile& operator=(const URLTestFile&) = delete;
  const std::string& path() const { return path_; }

 private:
  std::string path_;
};

}  // namespace zelkord
