#pragma once

#include <functional>
#include <map>
#include <string>

#include "base/Mutex.h"
#include "platform/api/URLCache.h"

namespace zelkord {

// Keeps by URL what is stored, and nothing by itself. Threading: any thread.
class FakeURLCache final : public URLCache {
 public:
  // Called in `lookup`, on its thread: may take its time. Set while nothing looks anything up.
  void setOnLookup(std::function<void()> handler) { onLookup_ = std::move(handler); }

  std::optional<CachedResponse> lookup(const URLRequest& request) override {
    if (onLookup_) onLookup_();
    const MutexLock lock(mutex_);
    const auto found = kept_.find(request.url);
    return found == kept_.end() ? std::nullopt : std::optional(found->second);
  }
  void store(const URLRequest& request, CachedResponse response) override {
    const MutexLock lock(mutex_);
    kept_[request.url] = std::move(response);
  }
  std::size_t count() const {
    const MutexLock lock(mutex_);
    return kept_.size();
  }

 private:
  std::function<void()> onLookup_;
  mutable Mutex mutex_;
  std::map<std::string, CachedResponse> kept_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
