#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include "base/Namespace.h"

namespace zelkor {

// Immutable shared bytes: an owned buffer or a mapped file. Copies share; a default-made one is
// empty.
//
// Threading: any thread. Ownership: the bytes live as long as any copy.
class Data {
 public:
  Data() = default;
  explicit Data(std::string bytes) {
    auto owned = std::make_shared<const std::string>(std::move(bytes));
    view_ = *owned;
    owner_ = std::move(owned);
  }
  // Bytes that `owner` keeps alive, such as a mapping.
  Data(std::shared_ptr<const void> owner, std::string_view view)
      : owner_(std::move(owner)), view_(view) {}

  std::string_view view() const { return view_; }
  const char* data() const { return view_.data(); }
  std::size_t size() const { return view_.size(); }
  bool empty() const { return view_.empty(); }

  friend bool operator==(const Data& a, const Data& b) { return a.view_ == b.view_; }

 private:
  std::shared_ptr<const void> owner_;
  std::string_view view_;
};

}  // namespace zelkor
