#include "zelkord/query/ArrivedImages.h"

namespace zelkord {

void ArrivedImages::add(const std::string& url, const Data& bytes) {
  const MutexLock lock(mutex_);
  if (bytes.empty() || bytes.size() > kMostBytes - bytes_) return;
  if (images_.emplace(url, bytes).second) bytes_ += bytes.size();
}

std::optional<Data> ArrivedImages::find(const std::string& url) const {
  const MutexLock lock(mutex_);
  const auto found = images_.find(url);
  if (found == images_.end()) return std::nullopt;
  return found->second;
}

}  // namespace zelkord
