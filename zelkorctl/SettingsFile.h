#pragma once

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "base/Error.h"

struct sqlite3;

namespace zelkorctl {

// The user's settings as they lie on the disk, for when no daemon runs.
//
// Threading: one thread. Errors: `error` says why the last operation gave nothing; a missing row
// is none.
class SettingsFile {
 public:
  // Makes the file, and its folder, when they are missing.
  explicit SettingsFile(const std::string& path);

  std::optional<std::string> read(const std::string& domain, const std::string& key);
  void write(const std::string& domain, const std::string& key, const std::string& json);
  void remove(const std::string& domain, const std::string& key);
  // Keys with their JSON.
  std::vector<std::pair<std::string, std::string>> list(const std::string& domain);

  const std::optional<zelkor::Error>& error() const { return error_; }

 private:
  struct Closer {
    void operator()(sqlite3* database) const;
  };
  using Row = std::vector<std::string>;

  std::vector<Row> _run(const char* sql, const std::vector<std::string>& values);

  std::unique_ptr<sqlite3, Closer> database_;
  std::optional<zelkor::Error> error_;
};

// In the state directory of the user.
std::string settingsFilePath();

}  // namespace zelkorctl
