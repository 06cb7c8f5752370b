#include "corezelkor/client/Results.h"

#include <algorithm>
#include <string>

#include "base/Text.h"

namespace zelkor {
namespace {

json::array objectsAmong(json::array& list) {
  json::array objects;
  for (auto& element : list) {
    if (element.is_object()) objects.push_back(std::move(element));
  }
  return objects;
}

bool goesOnFrom(const json::value& set, const std::string& typed) {
  return lowercased(stringIn(set.get_object(), "query").value_or("")).starts_with(typed);
}

}  // namespace

std::optional<json::array> resultsFor(std::string_view typed, const ClientAnswer& answer) {
  if (!answer.reply) return std::nullopt;
  auto parsed = parseJson(answer.reply->data.view());
  if (!parsed || !parsed->is_array()) return std::nullopt;
  auto sets = objectsAmong(parsed->get_array());
  if (answer.reply->httpResponse) return sets;
  const auto text = lowercased(replaceNoncharacters(typed));  // as it was sent
  const auto fits = [&](const json::value& set) { return goesOnFrom(set, text); };
  if (std::none_of(sets.begin(), sets.end(), fits)) return sets;
  json::array fitting;
  for (auto& set : sets) {
    if (fits(set)) fitting.push_back(std::move(set));
  }
  return fitting;
}

}  // namespace zelkor
