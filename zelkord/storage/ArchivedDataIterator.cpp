#include "zelkord/storage/ArchivedDataIterator.h"

#include "zelkord/storage/ContainerFormat.h"

namespace zelkord {

std::optional<std::string_view> ArchivedDataIterator::readNextObject() {
  const std::uint64_t size = data_.size();
  if (position_ + kLengthSize >= size) {
    log_.error("out of range");
    return std::nullopt;
  }
  const auto length = framedLengthAt(data_.view(), position_);
  if (length == 0) {
    log_.error("empty data file");
    return std::nullopt;
  }
  const auto begin = position_ + kLengthSize;
  if (length > size - begin) {
    log_.error("broken version string in file");
    return std::nullopt;
  }
  position_ = begin + length;
  return data_.view().substr(begin, length);
}

bool ArchivedDataIterator::hasMore() const { return position_ + kLengthSize <= data_.size(); }

}  // namespace zelkord
