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

// The same of a text that is to hold an object; anything else counts as nothing.
struct JsonObjectText : JsonText {
  JsonObjectText() = default;
  JsonObjectText(JsonText json)  // NOLINT(google-explicit-constructor): a text, with a demand
      : JsonText(std::move(json)) {}
};

}  // namespace zelkor
