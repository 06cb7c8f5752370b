#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "base/Error.h"
#include "base/Json.h"

namespace zelkord {

// Binary property lists. Null cannot stand in one: it is dropped with its key or array element.
// Threading: any thread.
class PropertyListCoder {
 public:
  virtual ~PropertyListCoder() = default;
  virtual std::optional<std::string> encode(const json::object& dictionary, Error* error) const = 0;
  // Any value that JSON can hold (dates become seconds since 1970, data base64 text). None on
  // failure.
  virtual std::optional<json::value> decode(std::string_view bytes, Error* error) const = 0;
};

}  // namespace zelkord
