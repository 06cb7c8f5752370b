#include "zelkorctl/OptionValues.h"

#include <charconv>

namespace zelkorctl {

Problem readCount(std::int64_t& target, const std::string& text, std::int64_t least,
                  std::int64_t most) {
  std::int64_t value = 0;
  const auto* end = text.data() + text.size();
  const auto [stop, code] = std::from_chars(text.data(), end, value);
  if (code != std::errc() || stop != end || value < least || value > most) {
    return "a number from " + std::to_string(least) + " to " + std::to_string(most);
  }
  target = value;
  return {};
}

Problem readSeconds(zelkor::Duration& target, const std::string& text) {
  double value = 0;
  const auto* end = text.data() + text.size();
  const auto [stop, code] = std::from_chars(text.data(), end, value);
  if (code != std::errc() || stop != end || !(value > 0) || value > 86400) {
    return "seconds, above 0 and up to 86400";
  }
  target = zelkor::durationOfSeconds(value);
  return {};
}

Problem readMilliseconds(zelkor::Duration& target, const std::string& text, std::int64_t most) {
  std::int64_t milliseconds = 0;
  auto problem = readCount(milliseconds, text, 0, most);
  if (problem.empty()) target = std::chrono::milliseconds(milliseconds);
  return problem;
}

Problem readText(std::string& target, const std::string& text) {
  target = text;
  return {};
}

Problem readTexts(std::vector<std::string>& target, const std::string& text) {
  if (text.empty()) return "a text";
  target.push_back(text);
  return {};
}

Problem setFlag(bool& target) {
  target = true;
  return {};
}

}  // namespace zelkorctl
