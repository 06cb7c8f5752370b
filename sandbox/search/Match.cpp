#include "sandbox/search/Match.h"

#include <algorithm>
#include <array>
#include <tuple>
#include <unordered_set>

namespace sandbox {

namespace {

// Most results of each kind among eight; in the order of Kind.
constexpr std::array<std::size_t, kKindCount> kShares = {5, 3, 2, 1, 1, 3};

bool ranksHigher(const Match& a, const Match& b) {
  return std::tuple(-a.weight, a.text.size(), a.entry) <
         std::tuple(-b.weight, b.text.size(), b.entry);
}

}  // namespace

std::vector<Match> pickMixed(std::vector<Match> matches, std::size_t limit) {
  std::sort(matches.begin(), matches.end(), ranksHigher);
  std::array<std::size_t, kKindCount> taken{};
  std::unordered_set<std::int64_t> seen;
  std::vector<Match> picked;
  std::vector<Match> spare;
  for (Match& match : matches) {
    if (!seen.insert(match.entry).second) continue;
    const auto kind = static_cast<std::size_t>(match.kind);
    auto& target = taken[kind]++ < kShares[kind] ? picked : spare;
    if (target.size() < limit) target.push_back(std::move(match));
  }
  for (std::size_t at = 0; at < spare.size() && picked.size() < limit; ++at)
    picked.push_back(std::move(spare[at]));
  std::stable_sort(picked.begin(), picked.end(), ranksHigher);
  return picked;
}

std::vector<Match> pickAfter(std::vector<Match> matches, std::size_t limit) {
  std::unordered_set<std::int64_t> seen;
  for (const Match& match : pickMixed(matches, limit)) seen.insert(match.entry);
  std::sort(matches.begin(), matches.end(), ranksHigher);
  std::erase_if(matches, [&](const Match& match) { return !seen.insert(match.entry).second; });
  return matches;
}

std::vector<Match> pickCompletions(const std::vector<Match>& ordered, std::size_t limit) {
  std::unordered_set<std::string> seen;
  std::vector<Match> picked;
  for (const Match& match : ordered) {
    if (picked.size() == limit) break;
    if (seen.insert(match.text).second) picked.push_back(match);
  }
  return picked;
}

double scoreOfWeight(int weight) { return std::clamp((weight + 4000) / 20000.0, 0.01, 1.0); }

}  // namespace sandbox
