#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "halvane/PackedItem.h"

namespace zelkor {

// A record that may be absent and is kept as in a message, after its length: see PackedList. Used
// like an optional, but for changes: those are made to a copy that is then put back.
//
// Threading: a value.
template <typename Record>
class Packed {
 public:
  using value_type = Record;

  // What `->` holds while it is used.
  class Arrow {
   public:
    explicit Arrow(Record record) : record_(std::move(record)) {}
    const Record* operator->() const { return &record_; }

   private:
    const Record record_;
  };

  Packed() = default;
  Packed(std::nullopt_t) {}       // NOLINT(google-explicit-constructor): like an optional
  Packed(const Record& record) {  // NOLINT(google-explicit-constructor): like an optional
    packItem(record, bytes_);
  }

  explicit operator bool() const { return !bytes_.empty(); }
  bool has_value() const { return !bytes_.empty(); }
  // These require a record.
  Record operator*() const { return unpackItem<Record>(packed()); }
  Arrow operator->() const { return Arrow(**this); }
  std::string_view packed() const { return firstPacked(bytes_); }

 private:
  std::string bytes_;
};

}  // namespace zelkor
