#include "zelkord/query/ArrivedImages.h"

#include <algorithm>
#include <utility>

namespace zelkord {

ArrivedImages::ArrivedImages(Order order, Budget& bytes, const std::string& holder)
    : order_(std::move(order)), share_(bytes.take(holder, 0)) {}

void ArrivedImages::add(const std::string& url, const Data& bytes) {
  const auto place = order_.find(url);
  if (bytes.empty() || place == order_.end()) return;
  const MutexLock lock(mutex_);
  if (_makeRoom(place->second, bytes.size())) images_.emplace(place->second, Image{url, bytes});
}

bool ArrivedImages::_makeRoom(std::size_t place, std::size_t size) {
  while (share_ && !share_->resize(share_->amount() + size)) {
    if (images_.empty() || images_.rbegin()->first <= place) return false;
    const auto last = std::prev(images_.end());
    share_->resize(share_->amount() - last->second.bytes.size());
    images_.erase(last);
  }
  return share_.has_value();
}

std::optional<Data> ArrivedImages::find(const std::string& url) const {
  const auto place = order_.find(url);
  if (place == order_.end()) return std::nullopt;
  const MutexLock lock(mutex_);
  const auto [first, last] = images_.equal_range(place->second);
  const auto found =
      std::find_if(first, last, [&url](const auto& image) { return image.second.url == url; });
  if (found == last) return std::nullopt;
  return found->second.bytes;
}

}  // namespace zelkord
