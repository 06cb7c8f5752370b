#pragma once

#include <stdlib.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <string_view>

#include "base/Check.h"

namespace zelkord {

// A directory of its own for one test, gone with it.
class TemporaryDirectory final {
 public:
  TemporaryDirectory() : path_(std::filesystem::temp_directory_path() / "zelkord-test.XXXXXX") {
    ZK_CHECK(::mkdtemp(path_.data()), "no temporary directory");
  }
  ~TemporaryDirectory() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
  }
  TemporaryDirectory(const TemporaryDirectory&) = delete;
  TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

  const std::string& path() const { return path_; }
  std::string operator/(std::string_view name) const { return path_ + "/" + std::string(name); }

  // Makes the file and the directories above it.
  void write(std::string_view name, std::string_view text) const {
    const std::filesystem::path file = *this / name;
    std::filesystem::create_directories(file.parent_path());
    std::ofstream(file, std::ios::binary) << text;
  }
  std::string read(std::string_view name) const {
    std::ifstream file(*this / name, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
  }
  bool has(std::string_view name) const { return std::filesystem::exists(*this / name); }

 private:
  std::string path_;
};

}  // namespace zelkord
