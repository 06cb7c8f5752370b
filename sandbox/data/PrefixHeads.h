#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "sandbox/data/Entry.h"

namespace sandbox {

// One text under which an entry is found, with its rank among others.
struct Term {
  std::string text;  // folded
  std::int64_t entry = 0;
  int weight = 0;
  Kind kind = Kind::Word;
};

// A prefix that more terms share than this has its best ones listed in advance; others are ranked
// when asked.
inline constexpr std::size_t kLargestUnlistedPrefix = 128;
// How many of each kind such a list has.
inline constexpr std::size_t kListedOfKind = 12;

// Gives, for every prefix shared by more than `kLargestUnlistedPrefix` terms, the best terms of
// each kind. Sorts `terms` by text.
void listPrefixHeads(std::vector<Term>& terms,
                     const std::function<void(std::string_view prefix, const Term& term)>& yield);

}  // namespace sandbox
