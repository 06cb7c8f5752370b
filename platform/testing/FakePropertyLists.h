#pragma once

#include "platform/api/PropertyList.h"

namespace zelkord {

// Property lists as readable text: "plist " and JSON. Null is dropped as in a real one.
//
// Threading: any thread, once `failure` is set.
class FakePropertyLists final : public PropertyListCoder {
 public:
  // What both operations then fail with.
  std::optional<Error> failure;

  std::optional<std::string> encode(const json::object& dictionary, Error* error) const override;
  std::optional<json::value> decode(std::string_view bytes, Error* error) const override;
};

}  // namespace zelkord
