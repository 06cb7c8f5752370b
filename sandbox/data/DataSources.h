#pragma once

#include <filesystem>
#include <string>
#include <vector>

namespace sandbox {

// Where the data of the Debian packages is, all below one root (usually /usr/share).
struct DataSources {
  explicit DataSources(std::filesystem::path dataRoot) : root(std::move(dataRoot)) {}

  std::filesystem::path wordnet() const { return root / "wordnet"; }
  std::filesystem::path isoCodes() const { return root / "iso-codes/json"; }
  std::filesystem::path unicode() const { return root / "unicode"; }
  std::filesystem::path flags() const { return root / "flags/countries/16x11"; }

  // Packages whose data is not there.
  std::vector<std::string> missingPackages() const;

  // Changes when a file that the index is built from changes.
  std::string signature() const;

  std::filesystem::path root;
};

}  // namespace sandbox
