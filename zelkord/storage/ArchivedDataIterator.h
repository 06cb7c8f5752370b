#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

#include "base/Data.h"
#include "platform/api/Log.h"

namespace zelkord {

// Walks the records of a container's bytes.
// Threading: one thread. Ownership: the payloads borrow from `data`; the log outlives this.
// Errors: logged; none of the bytes is trusted.
class ArchivedDataIterator final {
 public:
  ArchivedDataIterator(Data data, const Logger& log) : data_(std::move(data)), log_(log) {}

  // The next payload; none at the end and at damage, where the position then stays.
  std::optional<std::string_view> readNextObject();
  bool hasMore() const;
  // Bytes walked so far.
  std::uint64_t position() const { return position_; }
  const Data& data() const { return data_; }

 private:
  const Data data_;
  const Logger& log_;
  std::uint64_t position_ = 0;
};

}  // namespace zelkord
