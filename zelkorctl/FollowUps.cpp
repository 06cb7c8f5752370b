#include "zelkorctl/FollowUps.h"

#include "zelkorctl/ResponseSets.h"

namespace zelkorctl {

using namespace zelkor;

std::optional<std::string> moreResultsURL(std::string_view data, std::string_view typed) {
  const auto parsed = parseJson(data);
  const auto* sets = parsed ? parsed->if_array() : nullptr;
  if (!sets) return std::nullopt;
  for (const auto* set : fittingSets(*sets, typed)) {
    if (auto url = stringIn(*set, "more_results_url")) return url;
  }
  return std::nullopt;
}

std::optional<std::string> cardURL(std::string_view data, std::string_view typed,
                                   std::size_t result) {
  const auto parsed = parseJson(data);
  const auto* sets = parsed ? parsed->if_array() : nullptr;
  if (!sets) return std::nullopt;
  std::size_t number = 0;
  for (const auto* set : fittingSets(*sets, typed)) {
    for (const auto* each : objectsIn(*set, "results")) {
      if (++number == result) return stringIn(*each, "card_url");
    }
  }
  return std::nullopt;
}

}  // namespace zelkorctl
