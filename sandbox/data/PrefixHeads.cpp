#include "sandbox/data/PrefixHeads.h"

#include <algorithm>
#include <array>
#include <span>
#include <tuple>

namespace sandbox {

namespace {

using Yield = std::function<void(std::string_view prefix, const Term& term)>;

bool ranksBefore(const Term* a, const Term* b) {
  return std::tuple(-a->weight, a->text.size(), a->entry) <
         std::tuple(-b->weight, b->text.size(), b->entry);
}

void listHead(std::span<const Term> group, std::string_view prefix, const Yield& yield) {
  std::array<std::vector<const Term*>, kKindCount> kinds;
  for (const Term& term : group) kinds[static_cast<std::size_t>(term.kind)].push_back(&term);
  for (auto& terms : kinds) {
    const auto end =
        terms.begin() + static_cast<std::ptrdiff_t>(std::min(terms.size(), kListedOfKind));
    std::partial_sort(terms.begin(), end, terms.end(), ranksBefore);
    std::for_each(terms.begin(), end, [&](const Term* term) { yield(prefix, *term); });
  }
}

// The terms at the front of `terms` that begin with the first `length` bytes of the first one.
std::size_t sizeOfGroup(std::span<const Term> terms, std::size_t length) {
  const std::string_view prefix = std::string_view(terms.front().text).substr(0, length);
  const auto end = std::partition_point(terms.begin(), terms.end(), [&](const Term& term) {
    return term.text.compare(0, length, prefix) == 0;
  });
  return static_cast<std::size_t>(end - terms.begin());
}

// All `group` shares its first `length` bytes.
void listLongerPrefixes(std::span<const Term> group, std::size_t length, const Yield& yield) {
  while (!group.empty()) {
    if (group.front().text.size() <= length) {
      group = group.subspan(1);
      continue;
    }
    const std::size_t size = sizeOfGroup(group, length + 1);
    if (size > kLargestUnlistedPrefix) {
      listHead(group.first(size), std::string_view(group.front().text).substr(0, length + 1),
               yield);
      listLongerPrefixes(group.first(size), length + 1, yield);
    }
    group = group.subspan(size);
  }
}

}  // namespace

void listPrefixHeads(std::vector<Term>& terms, const Yield& yield) {
  std::sort(terms.begin(), terms.end(), [](const Term& a, const Term& b) {
    return std::tie(a.text, a.entry) < std::tie(b.text, b.entry);
  });
  listLongerPrefixes(terms, 0, yield);
}

}  // namespace sandbox
