#pragma once

#include <cstddef>
#include <map>
#include <optional>
#include <string>
#include <unordered_map>

#include "base/Data.h"
#include "base/Mutex.h"
#include "platform/api/Budget.h"

namespace zelkord {

// What has come of the images of one call, by URL, as much as its share of the budget allows. When
// that is used up, images that the call names earlier push out those that it names later: an answer
// is the beginning of what was asked for, so it misses nothing by that.
//
// Threading: any thread.
class ArrivedImages final {
 public:
  // Place in the call, by URL.
  using Order = std::unordered_map<std::string, std::size_t>;

  ArrivedImages(Order order, Budget& bytes, const std::string& holder);

  // Without effect for an empty image, one that the order has not, and one that is too much.
  void add(const std::string& url, const Data& bytes);
  std::optional<Data> find(const std::string& url) const;

 private:
  struct Image {
    std::string url;
    Data bytes;
  };
  bool _makeRoom(std::size_t place, std::size_t size) ZK_REQUIRES(mutex_);

  // Fixed after construction.
  const Order order_;

  mutable Mutex mutex_;
  std::multimap<std::size_t, Image> images_ ZK_GUARDED_BY(mutex_);  // by place
  std::optional<Budget::Share> share_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
