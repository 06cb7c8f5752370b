#pragma once

#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>

#include "base/Error.h"

namespace zelkorctl {

// What bytes are by how they begin.
struct ImageType {
  std::string_view name;       // such as "image/png"
  std::string_view extension;  // such as ".png"
};
ImageType imageType(std::string_view bytes);

// Saves images under names that come from outside, so that none leaves the folder.
//
// A name is the last part of the image's URL path, or its identifier, in letters, digits and "._-",
// not beginning with a dot or a dash, with the extension of what the bytes are; the second of a
// name gets a number. Errors: a value.
class ImageFiles {
 public:
  explicit ImageFiles(std::string folder) : folder_(std::move(folder)) {}

  struct Saved {
    std::string path;
    std::optional<zelkor::Error> error;
  };
  Saved save(std::string_view key, std::string_view bytes);

 private:
  std::string _newName(std::string_view key, std::string_view extension);

  const std::string folder_;
  std::set<std::string> taken_;
};

}  // namespace zelkorctl
