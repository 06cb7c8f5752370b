#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace sandbox {

// One query item. Without "=" it has no value, which differs from an empty one.
struct QueryItem {
  std::string name;
  std::optional<std::string> value;

  friend bool operator==(const QueryItem&, const QueryItem&) = default;
};

// A request target taken apart and decoded as forms are: "+" is a blank.
struct Target {
  std::string path;
  std::vector<QueryItem> items;

  friend bool operator==(const Target&, const Target&) = default;
};

// Nothing when the target does not begin with "/" or has a "%" without two hexadecimal digits.
std::optional<Target> parseTarget(std::string_view target);

std::string percentEncoded(std::string_view text);

}  // namespace sandbox
