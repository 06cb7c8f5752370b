#pragma once

#include <random>
#include <string>
#include <vector>

namespace zelkord::soak {

// Real words to type.
class Words {
 public:
  // From a dictionary's index, whose lines begin with a word; throws std::runtime_error when there
  // are none.
  explicit Words(const std::string& path);

  const std::string& any(std::mt19937& random) const;

 private:
  std::vector<std::string> words_;
};

}  // namespace zelkord::soak
