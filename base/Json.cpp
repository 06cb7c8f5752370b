#include "base/Json.h"

#include <boost/json/basic_parser_impl.hpp>
#include <boost/json/parse.hpp>

namespace zelkor {
namespace {

// Takes what the parser finds, and keeps nothing.
struct NullHandler {
  static constexpr std::size_t max_object_size = static_cast<std::size_t>(-1);
  static constexpr std::size_t max_array_size = static_cast<std::size_t>(-1);
  static constexpr std::size_t max_key_size = static_cast<std::size_t>(-1);
  static constexpr std::size_t max_string_size = static_cast<std::size_t>(-1);

  using Code = json::error_code;
  using Text = json::string_view;
  bool on_document_begin(Code&) { return true; }
  bool on_document_end(Code&) { return true; }
  bool on_object_begin(Code&) { return true; }
  bool on_object_end(std::size_t, Code&) { return true; }
  bool on_array_begin(Code&) { return true; }
  bool on_array_end(std::size_t, Code&) { return true; }
  bool on_key_part(Text, std::size_t, Code&) { return true; }
  bool on_key(Text, std::size_t, Code&) { return true; }
  bool on_string_part(Text, std::size_t, Code&) { return true; }
  bool on_string(Text, std::size_t, Code&) { return true; }
  bool on_number_part(Text, Code&) { return true; }
  bool on_int64(std::int64_t, Text, Code&) { return true; }
  bool on_uint64(std::uint64_t, Text, Code&) { return true; }
  bool on_double(double, Text, Code&) { return true; }
  bool on_bool(bool, Code&) { return true; }
  bool on_null(Code&) { return true; }
  bool on_comment_part(Text, Code&) { return true; }
  bool on_comment(Text, Code&) { return true; }
};

}  // namespace

bool isJson(std::string_view text) {
  json::parse_options options;
  options.max_depth = kMaximumJsonDepth;
  json::basic_parser<NullHandler> parser(options);
  json::error_code code;
  const auto read = parser.write_some(false, text.data(), text.size(), code);
  return !code && read == text.size();
}

bool isJsonObject(std::string_view text) {
  return trimmedJson(text).substr(0, 1) == "{" && isJson(text);
}

std::string_view trimmedJson(std::string_view text) {
  constexpr std::string_view kSpace = " \t\r\n";
  const auto begin = text.find_first_not_of(kSpace);
  if (begin == std::string_view::npos) return {};
  return text.substr(begin, text.find_last_not_of(kSpace) - begin + 1);
}

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
