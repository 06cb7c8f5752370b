#include "platform/testing/FakePropertyLists.h"

#include <cerrno>

namespace zelkord {
namespace {

constexpr std::string_view kFakePropertyListMagic = "plist ";

json::value withoutNulls(const json::value& value) {
  if (const auto* array = value.if_array()) {
    json::array kept;
    for (const auto& element : *array) {
      if (!element.is_null()) kept.push_back(withoutNulls(element));
    }
    return kept;
  }
  const auto* object = value.if_object();
  if (!object) return value;
  json::object kept;
  for (const auto& [key, member] : *object) {
    if (!member.is_null()) kept[key] = withoutNulls(member);
  }
  return kept;
}

}  // namespace

std::optional<std::string> FakePropertyLists::encode(const json::object& dictionary,
                                                     Error* error) const {
  if (failure) {
    if (error) *error = *failure;
    return std::nullopt;
  }
  return std::string(kFakePropertyListMagic) + json::serialize(withoutNulls(dictionary));
}

std::optional<json::value> FakePropertyLists::decode(std::string_view bytes, Error* error) const {
  std::optional<json::value> value;
  if (!failure && bytes.substr(0, kFakePropertyListMagic.size()) == kFakePropertyListMagic) {
    value = parseJson(bytes.substr(kFakePropertyListMagic.size()));
  }
  if (!value && error) *error = failure ? *failure : posixError(EINVAL);
  return value;
}

}  // namespace zelkord
