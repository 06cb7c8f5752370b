#pragma once

#include <string>

#include "base/Json.h"
#include "zelkord/encoding/JsonWriting.h"

namespace zelkord {

inline std::string describedProperty(const std::string& value) { return value; }
inline std::string describedProperty(const JsonText& value) { return value.text; }
inline std::string describedProperty(const JsonObjectText& value) { return value.text; }
template <const auto& Table, typename Value>
std::string describedProperty(const Term<Table, Value>& term) {
  return std::string(term.text());
}
template <typename Value>
std::string describedProperty(const Value& value) {
  std::string text;
  return appendJson(value, text) ? text : std::string();
}
template <typename Value>
std::string describedProperty(const std::optional<Value>& value) {
  return value ? describedProperty(*value) : std::string();
}

// Every field of a record by its name, for dumps of what has no encoder: texts and names as they
// are, anything else as compact JSON, empty for what is not set.
template <typename Record>
json::object dictionaryWithPropertiesOfObject(const Record& record) {
  json::object properties;
  std::apply(
      [&](const auto&... field) {
        ((properties[field.key] = describedProperty(record.*field.member)), ...);
      },
      Record::fields());
  return properties;
}

}  // namespace zelkord
