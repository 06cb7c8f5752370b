#pragma once

#include <string>
#include <utility>

#include "base/Namespace.h"

namespace zelkor {

// A text that is a JSON document, and is sent as the value that it holds. One that does not parse
// counts as nothing.
struct JsonText {
  std::string text;

  JsonText() = default;
  explicit JsonText(std::string json) : text(std::move(json)) {}

  friend bool operator==(const JsonText&, const JsonText&) = default;
};

}  // namespace zelkor
