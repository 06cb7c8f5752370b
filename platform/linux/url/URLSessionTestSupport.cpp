#include "platform/linux/url/URLSessionTestSupport.h"

#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <utility>

#include "base/Check.h"

namespace zelkord {

URLCompletion URLResults::completion() {
  return [this](const std::shared_ptr<URLTask>&, const URLResult& result) {
    const MutexLock lock(mutex_);
    results_.push_back(result);
    changed_.notify_all();
  };
}

std::vector<URLResult> URLResults::wait(std::size_t count) {
  const auto limit = std::chrono::steady_clock::now() + 20s;
  const MutexLock lock(mutex_);
  while (results_.size() < count) {
    const auto status = changed_.wait_until(mutex_, limit);
    ZK_CHECK(status == std::cv_status::no_timeout, "tasks complete");
  }
  return results_;
}

std::size_t URLResults::count() const {
  const MutexLock lock(mutex_);
  return results_.size();
}

URLOutcome loadURL(URLSession& session, URLRequest request) {
  URLResults results;
  const auto task = session.dataTask(std::move(request), results.completion());
  task->resume();
  auto ended = results.wait(1);
  return {std::move(ended.front()), task->timingData(), task->currentRequest()};
}

URLTestFile::URLTestFile(const std::string& contents)
    : path_(std::filesystem::temp_directory_path() / "zelkord-url-XXXXXX") {
  const int file = mkstemp(path_.data());
  const bool written = file >= 0 && write(file, contents.data(), contents.size()) ==
                                        static_cast<ssize_t>(contents.size());
  ZK_CHECK(written, "a test file is written");
  ::close(file);
}

URLTestFile::~URLTestFile() { std::filesystem::remove(path_); }

}  // namespace zelkord
