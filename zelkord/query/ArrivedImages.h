#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <unordered_map>

#include "base/Data.h"
#include "base/Mutex.h"
#include "base/Namespace.h"

namespace zelkord {

// What has come of the images of one call, by URL. It holds more bytes than an answer, so that the
// first ones of a call are in its answer in whatever order they come, but not any number of them.
//
// Threading: any thread.
class ArrivedImages final {
 public:
  static constexpr std::size_t kMostBytes = 128u << 20;

  // Without effect for an empty image, and for one that is too much.
  void add(const std::string& url, const Data& bytes);
  std::optional<Data> find(const std::string& url) const;

 private:
  mutable Mutex mutex_;
  std::unordered_map<std::string, Data> images_ ZK_GUARDED_BY(mutex_);
  std::size_t bytes_ ZK_GUARDED_BY(mutex_) = 0;
};

}  // namespace zelkord
