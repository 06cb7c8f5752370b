#pragma once

#include <string>
#include <vector>

#include "zelkorctl/Commands.h"
#include "zelkorctl/QueryRun.h"

namespace zelkorctl {

// How the commands that ask something show what came.

// One line, or one JSON value; with --verbose the HTTP exchange too.
void showOutcome(const Invocation& invocation, const Outcome& outcome);

// The best results of its answer; nothing with --json.
void showResults(const Invocation& invocation, const Outcome& outcome);
// The cards of its answer, likewise.
void showCards(const Invocation& invocation, const Outcome& outcome);

// The exit status that stands for it, or for the worst of them.
int statusOf(const Outcome& outcome);
int statusOf(const std::vector<Outcome>& outcomes);

// The words of a query with a space between them.
std::string joinedWords(const std::vector<std::string>& words);

}  // namespace zelkorctl
