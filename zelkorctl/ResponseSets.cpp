#include "zelkorctl/ResponseSets.h"

#include "base/Text.h"

namespace zelkorctl {

using namespace zelkor;

std::vector<const json::object*> objectsOf(const json::array& list) {
  std::vector<const json::object*> objects;
  for (const auto& element : list) {
    if (const auto* object = element.if_object()) objects.push_back(object);
  }
  return objects;
}

std::vector<const json::object*> objectsIn(const json::object& object, std::string_view key) {
  const auto* list = arrayIn(object, key);
  return list ? objectsOf(*list) : std::vector<const json::object*>();
}

std::vector<const json::object*> fittingSets(const json::array& sets, std::string_view typed) {
  auto all = objectsOf(sets);
  const auto text = lowercased(typed);
  auto fitting = all;
  std::erase_if(fitting, [&](const json::object* set) {
    return !lowercased(stringIn(*set, "query").value_or("")).starts_with(text);
  });
  return fitting.empty() ? all : fitting;
}

}  // namespace zelkorctl
