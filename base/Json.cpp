#include "base/Json.h"

#include <boost/json/parse.hpp>

namespace zelkor {

std::optional<json::value> parseJson(std::string_view text, std::string* problem) {
  json::parse_options options;
  options.max_depth = kMaximumJsonDepth;
  json::error_code code;
  try {
    auto value = json::parse(text, code, {}, options);
    if (!code) return value;
  } catch (const std::exception& error) {  // allocation limits of the library
    if (problem) *problem = error.what();
    return std::nullopt;
  }
  if (problem) *problem = code.message();
  return std::nullopt;
}

std::optional<double> asNumber(const json::value& value) {
  if (const auto* number = value.if_double()) return *number;
  if (const auto* number = value.if_int64()) return static_cast<double>(*number);
  if (const auto* number = value.if_uint64()) return static_cast<double>(*number);
  return std::nullopt;
}

const json::object* objectIn(const json::object& object, std::string_view key) {
  const auto* value = object.if_contains(key);
  return value ? value->if_object() : nullptr;
}

const json::array* arrayIn(const json::object& object, std::string_view key) {
  const auto* value = object.if_contains(key);
  return value ? value->if_array() : nullptr;
}

std::optional<std::string> stringIn(const json::object& object, std::string_view key) {
  const auto* value = object.if_contains(key);
  if (!value || !value->is_string()) return std::nullopt;
  return std::string(value->get_string());
}

std::optional<double> numberIn(const json::object& object, std::string_view key) {
  const auto* value = object.if_contains(key);
  return value ? asNumber(*value) : std::nullopt;
}

std::optional<bool> boolIn(const json::object& object, std::string_view key) {
  const auto* value = object.if_contains(key);
  if (!value || !value->is_bool()) return std::nullopt;
  return value->get_bool();
}

}  // namespace zelkor
