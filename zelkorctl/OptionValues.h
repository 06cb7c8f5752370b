#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "base/Time.h"

// Values of options, from the words of a command line. `target` is left alone when one is wrong.
namespace zelkorctl {

// What a value should have been; empty when it is right.
using Problem = std::string;

Problem readCount(std::int64_t& target, const std::string& text, std::int64_t least,
                  std::int64_t most);
// Above 0, at most a day.
Problem readSeconds(zelkor::Duration& target, const std::string& text);
Problem readMilliseconds(zelkor::Duration& target, const std::string& text, std::int64_t most);
Problem readText(std::string& target, const std::string& text);
// One more, not empty.
Problem readTexts(std::vector<std::string>& target, const std::string& text);
Problem setFlag(bool& target);

// One of the table's names.
template <typename Value, std::size_t size>
Problem readNamed(Value& target, const std::string& text,
                  const std::array<std::pair<std::string_view, Value>, size>& table) {
  std::string names;
  for (const auto& [name, value] : table) {
    if (name == text) {
      target = value;
      return {};
    }
    names += (names.empty() ? "one of " : ", ") + std::string(name);
  }
  return names;
}

}  // namespace zelkorctl
