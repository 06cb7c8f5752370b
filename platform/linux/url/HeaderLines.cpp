#include "platform/linux/url/HeaderLines.h"

namespace zelkord {

std::string& HeaderLines::_nextLine() {
  if (count_ == lines_.size()) lines_.emplace_back();
  std::string& line = lines_[count_++];
  line.clear();
  return line;
}

void HeaderLines::set(const URLRequest& request) {
  count_ = 0;
  for (const auto& [name, value] : request.headers) {
    const bool isBlank = value.find_first_not_of(" \t") == std::string::npos;
    // libcurl takes "Name:" for "leave that header out" and "Name;" for one without a value.
    _nextLine().append(name).append(isBlank ? ";" : ": ").append(isBlank ? "" : value);
  }
  _nextLine() = "Expect:";
  if (!request.header("Content-Type")) _nextLine() = "Content-Type:";
  nodes_.resize(count_);
  for (std::size_t i = 0; i < count_; ++i) {
    nodes_[i] = {lines_[i].data(), i + 1 < count_ ? &nodes_[i + 1] : nullptr};
  }
}

}  // namespace zelkord
