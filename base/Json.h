#pragma once

#include <boost/json/array.hpp>
#include <boost/json/object.hpp>
#include <boost/json/serialize.hpp>
#include <boost/json/value.hpp>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "base/Export.h"
#include "base/Namespace.h"

namespace zelkor {

namespace json = boost::json;

// The deepest nesting accepted in a document that comes from outside.
inline constexpr std::size_t kMaximumJsonDepth = 512;

// Parses one JSON document (UTF-8, RFC 8259). None when it does not parse or nests deeper than
// kMaximumJsonDepth; `problem`, when given, then gets a one-line text. Throws nothing.
ZK_EXPORT std::optional<json::value> parseJson(std::string_view text,
                                               std::string* problem = nullptr);

// Without the white space around it.
ZK_EXPORT std::string_view trimmedJson(std::string_view text);

// Whether `parseJson` would accept the text; builds no value.
ZK_EXPORT bool isJson(std::string_view text);
// The same, for documents that are an object.
ZK_EXPORT bool isJsonObject(std::string_view text);

// The member of that name when it has the type; a value of another type counts as absent.
ZK_EXPORT const json::object* objectIn(const json::object& object, std::string_view key);
ZK_EXPORT const json::array* arrayIn(const json::object& object, std::string_view key);
ZK_EXPORT std::optional<std::string> stringIn(const json::object& object, std::string_view key);
ZK_EXPORT std::optional<double> numberIn(const json::object& object, std::string_view key);
ZK_EXPORT std::optional<bool> boolIn(const json::object& object, std::string_view key);

// Any number as a double; none for other kinds.
ZK_EXPORT std::optional<double> asNumber(const json::value& value);

}  // namespace zelkor
