#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "sandbox/data/Entry.h"

namespace sandbox {

// An entry found by one of its texts.
struct Match {
  std::string text;  // the folded text it was found by
  std::int64_t entry = 0;
  int weight = 0;
  Kind kind = Kind::Word;
};

// Orders by weight, keeps each entry's best match, and of those the first `limit`, with no kind
// above its share, so that one kind never crowds out the others. Kinds fill up again when too few
// others are there.
std::vector<Match> pickMixed(std::vector<Match> matches, std::size_t limit);

// The entries that pickMixed leaves out at that limit, each by its best match, in order of weight.
std::vector<Match> pickAfter(std::vector<Match> matches, std::size_t limit);

// Up to `limit` different texts of the matches, best first, for completing what was typed.
std::vector<Match> pickCompletions(const std::vector<Match>& ordered, std::size_t limit);

// `weight` as a score between 0 and 1.
double scoreOfWeight(int weight);

}  // namespace sandbox
