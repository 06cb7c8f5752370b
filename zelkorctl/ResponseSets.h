#pragma once

#include <string_view>
#include <vector>

#include "base/Json.h"

namespace zelkorctl {

// The objects of a list, whatever else it holds. They live as long as the list.
std::vector<const zelkor::json::object*> objectsOf(const zelkor::json::array& list);

// The same of a member; none when it is no list.
std::vector<const zelkor::json::object*> objectsIn(const zelkor::json::object& object,
                                                   std::string_view key);

}  // namespace zelkorctl
