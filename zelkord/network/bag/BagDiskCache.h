#pragma once

#include <optional>
#include <string>

#include "base/Error.h"
#include "base/Json.h"

namespace zelkord {

class Assembly;

// The bag's file, "bag.plist" in the caches directory: a binary property list, 0600, replaced
// whole. JSON null cannot stand in it and is left out.
//
// Threading: any thread; both operations block for the file system.
// Ownership: the assembly outlives it.
// Errors: logged. A file that cannot be read counts as absent; one that cannot be written stays as
// it was. With the assembly's disk bag cache off nothing is read or written.
class BagDiskCache final {
 public:
  explicit BagDiskCache(Assembly& assembly) : assembly_(assembly) {}

  void write(const json::object& dictionary) const;
  std::optional<json::object> read() const;

 private:
  // Makes the directory when it is missing.
  std::optional<std::string> _pathToCachedBag(Error* error) const;
  void _logEncodingError(const Error& error, const std::string& path) const;
  std::uint64_t _maximumFileSize() const;

  Assembly& assembly_;
};

}  // namespace zelkord
