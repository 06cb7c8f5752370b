#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <utility>

#include "base/Data.h"
#include "base/Error.h"
#include "base/FunctionRef.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord {

// The folder of the cache and the bodies in it that have a file of their own, named after the
// entry's id: "00000000000000a7.body".
//
// Threading: one thread at a time. Errors: POSIX errors as values.
class BodyFiles final {
 public:
  // A larger one is not there, whoever made it.
  static constexpr std::uint64_t kMaximumSize = 16 * 1024 * 1024;

  explicit BodyFiles(std::string folder) : folder_(std::move(folder)) {}

  const std::string& folder() const { return folder_; }
  // Makes the folder (0700) when it is missing; its parent must be there.
  std::optional<Error> makeFolder();

  // Requires a folder. A file that is there already is of nobody and goes.
  std::optional<Error> write(std::int64_t id, std::string_view bytes);
  // What is in the file; none when there is no regular file of that size. A copy: somebody may cut
  // or change the file at any time, and reading a mapping of it would then end the process.
  std::optional<Data> read(std::int64_t id, std::uint64_t size);
  void remove(std::int64_t id);
  // Removes all bodies of which nobody knows.
  void removeUnless(FunctionRef<bool(std::int64_t id)> isKnown);

 private:
  Descriptor _openFolder() const;

  const std::string folder_;
  Descriptor open_;
};

}  // namespace zelkord
