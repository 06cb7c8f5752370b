#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>

#include "halvane/Field.h"
#include "halvane/JsonText.h"
#include "halvane/Packed.h"
#include "halvane/PackedList.h"
#include "halvane/Vocabulary.h"

namespace zelkord {

// Writes values as compact JSON text (RFC 8259, UTF-8, "/" as it is) at the end of `text`. False
// when JSON cannot express the value: a number that is not finite, a text that is not UTF-8; what
// `text` then ends with is the caller's to cut off.

bool appendJsonString(std::string_view value, std::string& text);
bool appendJsonNumber(double value, std::string& text);
void appendJsonInteger(std::int64_t value, std::string& text);
void appendJsonInteger(std::uint64_t value, std::string& text);
// `"key":`, after a comma unless it is the first member of an object whose members begin at
// `begin`. Requires a key that needs no escapes.
void appendJsonKey(std::string_view key, std::size_t begin, std::string& text);

inline bool appendJson(bool value, std::string& text) {
  text += value ? "true" : "false";
  return true;
}

template <typename Number>
requires(std::is_integral_v<Number> &&
         !std::is_same_v<Number, bool>) bool appendJson(Number value, std::string& text) {
  using Wide = std::conditional_t<std::is_signed_v<Number>, std::int64_t, std::uint64_t>;
  appendJsonInteger(static_cast<Wide>(value), text);
  return true;
}

inline bool appendJson(double value, std::string& text) { return appendJsonNumber(value, text); }

inline bool appendJson(const std::string& value, std::string& text) {
  return appendJsonString(value, text);
}

// The text itself, when it is a JSON document; else null.
bool appendJson(const JsonText& value, std::string& text);
// The same, for objects only.
bool appendJson(const JsonObjectText& value, std::string& text);

bool appendJson(const std::map<std::string, std::string>& map, std::string& text);

// The name; null for a value that has none.
template <const auto& Table, typename Value>
bool appendJson(const Term<Table, Value>& term, std::string& text) {
  const auto name = term.text();
  const std::string_view quote = name.data() != nullptr ? "\"" : "";
  text += quote;
  text += name.data() != nullptr ? name : "null";  // names need no escapes
  text += quote;
  return true;
}

template <typename Record>
requires requires { Record::fields(); }
bool appendJson(const Record& record, std::string& text);

template <typename Value>
bool appendJson(const std::optional<Value>& value, std::string& text) {
  if (value) return appendJson(*value, text);
  text += "null";
  return true;
}

template <typename Record>
bool appendJson(const Packed<Record>& record, std::string& text) {
  if (record) return appendJson(*record, text);
  text += "null";
  return true;
}

template <typename Value>
bool appendJson(const PackedList<Value>& values, std::string& text) {
  text += '[';
  bool good = true;
  for (const auto value : values) {
    good = good && appendJson(value, text);
    text += ',';
  }
  if (values.empty()) {
    text += ']';
  } else {
    text.back() = ']';
  }
  return good;
}

template <typename Value>
constexpr bool isSet(const Value&) {
  return true;
}
template <typename Value>
bool isSet(const std::optional<Value>& value) {
  return value.has_value();
}

template <typename Record, typename OneField>
bool appendField(const Record& record, const OneField& field, std::size_t begin,
                 std::string& text) {
  const auto& value = record.*field.member;
  if (field.use == FieldUse::StoredOnly) return true;
  if (field.use == FieldUse::SentIfSet && !isSet(value)) return true;
  appendJsonKey(field.key, begin, text);
  return appendJson(value, text);
}

// The fields that are sent, as members of an object whose text began at `begin`.
template <typename Record>
bool appendFields(const Record& record, std::size_t begin, std::string& text) {
  return std::apply(
      [&](const auto&... field) { return (appendField(record, field, begin, text) && ...); },
      kFieldsOf<Record>);
}

template <typename Record>
requires requires { Record::fields(); }
bool appendJson(const Record& record, std::string& text) {
  text += '{';
  const bool good = appendFields(record, text.size(), text);
  text += '}';
  return good;
}

}  // namespace zelkord
