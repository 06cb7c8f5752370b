#pragma once

#include <ctime>
#include <filesystem>
#include <map>
#include <memory>
#include <string>

#include "sandbox/http/Message.h"

namespace sandbox {

// The pictures under /image/: flags/NAME.png from a folder, glyph/KIND.png drawn here. All are kept
// in memory.
//
// Threading: any thread; nothing changes after construction. Errors: an unknown path gives a 404.
class Images final {
 public:
  explicit Images(const std::filesystem::path& flags);

  // `request.path` begins with "/image/".
  Reply answer(const Request& request) const;

 private:
  struct Picture {
    std::shared_ptr<const std::string> bytes;
    std::string tag;
    std::time_t modified = 0;
  };

  void _add(const std::string& path, std::string bytes, std::time_t modified);
  void _addFlags(const std::filesystem::path& folder);

  std::map<std::string, Picture, std::less<>> pictures_;
};

}  // namespace sandbox
