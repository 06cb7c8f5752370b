#pragma once

#include "platform/api/FileHandle.h"
#include "platform/linux/files/Descriptor.h"

namespace zelkord {

// An open file on the disk.
class LinuxFileHandle final : public FileHandle {
 public:
  explicit LinuxFileHandle(Descriptor file) : file_(std::move(file)) {}

  std::optional<Data> map(Error* error) override;

 private:
  const Descriptor file_;
};

}  // namespace zelkord
