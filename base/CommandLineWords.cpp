#include "base/CommandLineWords.h"

#include <algorithm>

namespace zelkor {

std::vector<std::string> withSeparateEmptyValues(const std::vector<std::string>& words) {
  const auto end = std::find(words.begin(), words.end(), "--");
  std::vector<std::string> separate;
  for (auto word = words.begin(); word != end; ++word) {
    const bool isEmptyValue = word->starts_with("--") && word->find('=') == word->size() - 1;
    if (isEmptyValue) {
      separate.insert(separate.end(), {word->substr(0, word->size() - 1), ""});
    } else {
      separate.push_back(*word);
    }
  }
  separate.insert(separate.end(), end, words.end());
  return separate;
}

}  // namespace zelkor
