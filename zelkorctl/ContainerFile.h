#pragma once

#include <cstdint>
#include <string>
#include <variant>
#include <vector>

#include "halvane/StoredFeedback.h"

namespace zelkorctl {

using namespace zelkor;

// A feedback session as it lies on the disk, read whole: the daemon may be writing it.
struct ContainerFile {
  // The stored bytes beside what they hold, for whoever shows them field by field.
  struct Record {
    std::string className;
    std::string message;
    CZZelkorFeedback feedback;
  };

  std::uint64_t size = 0;  // bytes
  std::string version;     // the user agent of the daemon that wrote it
  CZClientSession header;
  std::vector<Record> records;
};

// Why a file is none, and at which byte.
struct ContainerFault {
  std::string text;
};

// Damage of any kind is a fault: nothing is shown of a file that is not whole.
std::variant<ContainerFile, ContainerFault> readContainer(const std::string& path);
// The same of bytes.
std::variant<ContainerFile, ContainerFault> parseContainer(std::string_view bytes);

// The numbers of the session files in a folder, ascending.
std::vector<std::uint32_t> containerNumbers(const std::string& folder);

// The user's caches folder of the daemon.
std::string cachesFolder();
std::string containerPath(std::uint32_t number);

}  // namespace zelkorctl
