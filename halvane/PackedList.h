#pragma once

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <iterator>
#include <string>
#include <string_view>
#include <vector>

#include "halvane/PackedItem.h"

namespace zelkor {

// A list whose items are kept as in a message, each after its length, and made when they are read.
// A client chooses how many there are, and an item that takes two bytes in a message may have
// hundreds in memory.
//
// Threading: a value.
template <typename Item>
class PackedList {
 public:
  using value_type = Item;

  class Iterator {
   public:
    using iterator_category = std::input_iterator_tag;
    using value_type = Item;
    using difference_type = std::ptrdiff_t;
    using pointer = const Item*;
    using reference = Item;

    Iterator() = default;
    explicit Iterator(std::string_view rest) : rest_(rest) {}
    Item operator*() const { return unpackItem<Item>(firstPacked(rest_)); }
    // The item as it is kept.
    std::string_view packed() const { return firstPacked(rest_); }
    Iterator& operator++() {
      const auto item = firstPacked(rest_);
      rest_ = {item.data() + item.size(),
               rest_.size() - static_cast<std::size_t>(item.data() + item.size() - rest_.data())};
      return *this;
    }
    void operator++(int) { ++*this; }
    friend bool operator==(const Iterator& a, const Iterator& b) {
      return a.rest_.size() == b.rest_.size();
    }

   private:
    std::string_view rest_;
  };

  PackedList() = default;
  PackedList(std::initializer_list<Item> items) { _assign(items); }
  PackedList(const std::vector<Item>& items) {  // NOLINT(google-explicit-constructor): a list too
    _assign(items);
  }

  void push_back(const Item& item) {
    packItem(item, bytes_);
    ++size_;
  }
  bool empty() const { return size_ == 0; }
  std::size_t size() const { return size_; }
  // Bytes of all items with their lengths.
  std::size_t packedSize() const { return bytes_.size(); }
  Iterator begin() const { return Iterator(bytes_); }
  Iterator end() const { return Iterator(); }
  // Requires an item.
  Item front() const { return *begin(); }

 private:
  template <typename Items>
  void _assign(const Items& items) {
    for (const auto& item : items) push_back(item);
  }

  std::string bytes_;
  std::uint32_t size_ = 0;
};

}  // namespace zelkor
