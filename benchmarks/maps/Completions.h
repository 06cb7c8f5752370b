#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace zelkord::bench {

// Lower-cased names of words, countries, regions, currencies, languages and characters from the
// data packages, each once, in an order that is shuffled but always the same.
//
// Errors: throws std::runtime_error when there are fewer than `count`.
std::vector<std::string> completions(std::size_t count);

// How many keys a prefix is to have.
struct MatchCount {
  std::size_t least, most;
};
// For each of the first `samples` keys its shortest prefix that has so many matches among all of
// them, if there is one.
std::vector<std::string> prefixesOf(const std::vector<std::string>& keys, std::size_t samples,
                                    MatchCount wanted);

}  // namespace zelkord::bench
