#include "sandbox/data/DataSources.h"

#include <sys/stat.h>

#include <array>
#include <utility>

namespace sandbox {

std::vector<std::string> DataSources::missingPackages() const {
  const std::array<std::pair<const char*, std::filesystem::path>, 4> packages = {{
      {"wordnet-base", wordnet() / "index.noun"},
      {"iso-codes", isoCodes() / "iso_3166-1.json"},
      {"unicode-data", unicode() / "UnicodeData.txt"},
      {"famfamfam-flag-png", flags() / "fr.png"},
  }};
  std::vector<std::string> missing;
  for (const auto& [name, file] : packages) {
    std::error_code error;
    if (!std::filesystem::exists(file, error)) missing.emplace_back(name);
  }
  return missing;
}

std::string DataSources::signature() const {
  std::string signature = root.string();
  for (const auto& file : {wordnet() / "index.noun", wordnet() / "data.noun",
                           isoCodes() / "iso_3166-1.json", isoCodes() / "iso_3166-2.json",
                           unicode() / "UnicodeData.txt", unicode() / "emoji/emoji-test.txt"}) {
    struct stat status {};
    const bool found = ::stat(file.c_str(), &status) == 0;
    signature +=
        ";" +
        (found ? std::to_string(status.st_size) + "@" + std::to_string(status.st_mtime) : "none");
  }
  return signature;
}

}  // namespace sandbox
