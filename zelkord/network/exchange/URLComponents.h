#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/Namespace.h"

namespace zelkord {

struct URLQueryItem {
  std::string name;
  std::optional<std::string> value;  // none: written without "="

  friend bool operator==(const URLQueryItem&, const URLQueryItem&) = default;
};

// An absolute URL taken apart, not resolved against anything. Items are decoded: percent escapes
// only, "+" is a plus.
struct URLComponents {
  std::string base;  // scheme, authority and path, as written
  std::vector<URLQueryItem> queryItems;
  std::string fragment;  // as written, with its "#"; empty: none

  // None for what is no absolute URL with a host: no scheme, characters that RFC 3986 leaves out
  // (in the query only controls, spaces and non-ASCII), a broken percent escape, more than
  // kMaximumURLLength bytes.
  static std::optional<URLComponents> parse(std::string_view url);

  // Percent-encodes in the query all but RFC 3986's unreserved characters and !$'()*,:@/?
  std::string string() const;
};

inline constexpr std::size_t kMaximumURLLength = 65536;

}  // namespace zelkord
