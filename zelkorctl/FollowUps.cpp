#include "zelkorctl/FollowUps.h"

#include <vector>

#include "base/Json.h"

namespace zelkorctl {
namespace {

namespace json = zelkor::json;

// Copies of the objects in a list; nothing for what is no list.
std::vector<json::object> objectsOf(const json::array* list) {
  std::vector<json::object> objects;
  if (!list) return objects;
  for (const auto& element : *list) {
    if (const auto* object = element.if_object()) objects.push_back(*object);
  }
  return objects;
}

std::vector<json::object> resultSets(std::string_view data) {
  const auto parsed = zelkor::parseJson(data);
  return objectsOf(parsed ? parsed->if_array() : nullptr);
}

}  // namespace

std::optional<std::string> moreResultsURL(std::string_view data) {
  for (const auto& set : resultSets(data)) {
    if (auto url = zelkor::stringIn(set, "more_results_url")) return url;
  }
  return std::nullopt;
}

std::optional<std::string> cardURL(std::string_view data, std::size_t result) {
  std::size_t number = 0;
  for (const auto& set : resultSets(data)) {
    for (const auto& each : objectsOf(zelkor::arrayIn(set, "results"))) {
      if (++number == result) return zelkor::stringIn(each, "card_url");
    }
  }
  return std::nullopt;
}

}  // namespace zelkorctl
