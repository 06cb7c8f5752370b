#pragma once

#include <string>
#include <thread>
#include <vector>

namespace zelkord::soak {

// A host on the loopback interface that takes connections and never says a word.
//
// Threading: its own thread; ends with it.
class StalledHost {
 public:
  StalledHost();
  ~StalledHost();
  StalledHost(const StalledHost&) = delete;
  StalledHost& operator=(const StalledHost&) = delete;

  // "https://localhost:PORT"
  const std::string& url() const { return url_; }

 private:
  void _take();

  int listening_ = -1;
  std::string url_;
  std::vector<int> taken_;  // the thread's
  std::thread thread_;
};

}  // namespace zelkord::soak
