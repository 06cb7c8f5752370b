#include "benchmarks/maps/Completions.h"

#include <algorithm>
#include <optional>
#include <random>
#include <stdexcept>
#include <string_view>

#include "sandbox/core/Text.h"
#include "sandbox/data/DataSources.h"
#include "sandbox/data/IsoReader.h"
#include "sandbox/data/UnicodeReader.h"
#include "sandbox/data/WordNetReader.h"

namespace zelkord::bench {
namespace {

std::vector<std::string> allTitles() {
  const sandbox::DataSources sources("/usr/share");
  std::vector<std::string> titles;
  const auto add = [&titles](const sandbox::SourceEntry& source) {
    titles.push_back(sandbox::lowerCased(source.entry.title));
  };
  sandbox::readWordNet(sources.wordnet(), add);
  sandbox::readIsoCodes(sources.isoCodes(), sources.flags(), add);
  sandbox::readCharacters(sources.unicode(), add);
  std::sort(titles.begin(), titles.end());
  titles.erase(std::unique(titles.begin(), titles.end()), titles.end());
  return titles;
}

// std::shuffle's order is the library's choice; this one is the same everywhere.
void shuffle(std::vector<std::string>& texts) {
  std::mt19937 random(2'048);
  for (auto i = texts.size(); i > 1; --i) std::swap(texts[i - 1], texts[random() % i]);
}

std::size_t matchesIn(const std::vector<std::string>& sorted, std::string_view prefix) {
  const auto first = std::lower_bound(sorted.begin(), sorted.end(), prefix);
  const auto end = std::find_if_not(first, sorted.end(),
                                    [prefix](const auto& key) { return key.starts_with(prefix); });
  return static_cast<std::size_t>(end - first);
}

std::optional<std::string> prefixOf(const std::string& key, const std::vector<std::string>& sorted,
                                    MatchCount wanted) {
  for (std::size_t length = 1; length <= key.size(); ++length) {
    const auto matches = matchesIn(sorted, std::string_view(key).substr(0, length));
    if (matches < wanted.least) break;
    if (matches <= wanted.most) return key.substr(0, length);
  }
  return std::nullopt;
}

}  // namespace

std::vector<std::string> completions(std::size_t count) {
  static const auto all = [] {
    auto titles = allTitles();
    shuffle(titles);
    return titles;
  }();
  if (all.size() < count)
    throw std::runtime_error("too few completions: install the data packages");
  return {all.begin(), all.begin() + static_cast<std::ptrdiff_t>(count)};
}

std::vector<std::string> prefixesOf(const std::vector<std::string>& keys, std::size_t samples,
                                    MatchCount wanted) {
  auto sorted = keys;
  std::sort(sorted.begin(), sorted.end());
  std::vector<std::string> prefixes;
  for (std::size_t i = 0; i < std::min(samples, keys.size()); ++i) {
    if (auto prefix = prefixOf(keys[i], sorted, wanted)) prefixes.push_back(std::move(*prefix));
  }
  return prefixes;
}

}  // namespace zelkord::bench
