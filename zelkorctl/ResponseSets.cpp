#include "zelkorctl/ResponseSets.h"

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

}  // namespace zelkorctl
