#pragma once

#include "platform/api/FileHandle.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord {

// An open file. One that is sealed is mapped; others are read into memory, as reading a mapping of
// what somebody cuts short meanwhile would end the process.
class LinuxFileHandle final : public FileHandle {
 public:
  explicit LinuxFileHandle(Descriptor file) : file_(std::move(file)) {}

  std::optional<Data> map(std::uint64_t limit, Error* error) override;

 private:
  std::optional<Data> _mapping(std::size_t size) const;
  std::optional<Data> _copy(std::uint64_t limit) const;

  const Descriptor file_;
};

}  // namespace zelkord
