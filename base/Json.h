#pragma once

#include <boost/json/array.hpp>
#include <boost/json/object.hpp>
#include <boost/json/serialize.hpp>
#include <boost/json/value.hpp>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "base/Namespace.h"

namespace zelkor {

namespace json = boost::json;

// The deepest nesting accepted in a document that comes from outside.
inline constexpr std::size_t kMaximumJsonDepth = 512;

// Parses one JSON document (UTF-8, RFC 8259). None when it does not parse or nests deeper than
// kMaximumJsonDepth; `problem`, when given, then gets a one-line text. Throws nothing.
std::optional<json::value> parseJson(std::string_view text, std::string* problem = nullptr);

// Without the white space around it.
std::string_view trimmedJson(std::string_view text);

// Whether `parseJson` would accept the text; builds no value.
bool isJson(std::string_view text);
// The same, for documents that are an object.
bool isJsonObject(std::string_view text);

// The member of that name when it has the type; a value of another type counts as absent.
const json::object* objectIn(const json::object& object, std::string_view key);
const json::array* arrayIn(const json::object& object, std::string_view key);
std::optional<std::string> stringIn(const json::object& object, std::string_view key);
std::optional<double> numberIn(const json::object& object, std::string_view key);
std::optional<bool> boolIn(const json::object& object, std::string_view key);

// Any number as a double; none for other kinds.
std::optional<double> asNumber(const json::value& value);

}  // namespace zelkor
