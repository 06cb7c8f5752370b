#pragma once

#include "platform/api/ContainerFiles.h"

namespace zelkord {

// Containers on the disk. Threading: any thread. Errors: POSIX errors.
class LinuxContainerFiles final : public ContainerFiles {
 public:
  std::optional<std::vector<std::string>> list(const std::string& directory, Error* error) override;
  std::optional<FileAttributes> attributes(const std::string& path, Error* error) override;
  std::optional<Error> createExclusively(const std::string& path) override;
  std::unique_ptr<AppendFile> openForAppending(const std::string& path, Error* error) override;
  std::optional<Error> cut(const std::string& path, std::uint64_t length) override;
};

}  // namespace zelkord
