#include "zelkorctl/FollowUps.h"

#include "corezelkor/client/Results.h"
#include "zelkorctl/ResponseSets.h"

namespace zelkorctl {

using namespace zelkor;

std::optional<std::string> moreResultsURL(const ClientAnswer& answer, std::string_view typed) {
  const auto sets = resultsFor(typed, answer).value_or(json::array());
  for (const auto* set : objectsOf(sets)) {
    if (auto url = stringIn(*set, "more_results_url")) return url;
  }
  return std::nullopt;
}

std::optional<std::string> cardURL(const ClientAnswer& answer, std::string_view typed,
                                   std::size_t result) {
  const auto sets = resultsFor(typed, answer).value_or(json::array());
  std::size_t number = 0;
  for (const auto* set : objectsOf(sets)) {
    for (const auto* each : objectsIn(*set, "results")) {
      if (++number == result) return stringIn(*each, "card_url");
    }
  }
  return std::nullopt;
}

}  // namespace zelkorctl
