#include "tests/soak/Words.h"

#include <algorithm>
#include <fstream>
#include <stdexcept>

namespace zelkord::soak {

Words::Words(const std::string& path) {
  std::ifstream file(path);
  for (std::string line; std::getline(file, line);) {
    auto word = line.substr(0, line.find(' '));
    if (word.size() < 3 || word.size() > 12) continue;
    if (std::ranges::all_of(word, [](char c) { return c >= 'a' && c <= 'z'; })) {
      words_.push_back(std::move(word));
    }
  }
  if (words_.empty()) throw std::runtime_error("no words in " + path);
}

const std::string& Words::any(std::mt19937& random) const {
  return words_[random() % words_.size()];
}

}  // namespace zelkord::soak
