#include "sandbox/service/KeyReader.h"

namespace sandbox {

std::uint64_t KeyReader::number(std::string_view key, std::uint64_t otherwise, std::uint64_t most) {
  const auto* value = _value(key);
  if (value == nullptr) return otherwise;
  boost::system::error_code error;
  const auto number = value->to_number<std::uint64_t>(error);
  if (error || number > most) fail(key);
  return number;
}

std::optional<std::string> KeyReader::text(std::string_view key) {
  const auto* value = _value(key);
  if (value == nullptr) return std::nullopt;
  if (value->is_string()) return std::string(value->get_string());
  fail(key);
  return std::nullopt;
}

std::vector<std::string> KeyReader::texts(std::string_view key) {
  std::vector<std::string> texts;
  const auto* value = _value(key);
  if (value == nullptr) return texts;
  if (!value->is_array())
    fail(key);
  else
    for (const auto& text : value->get_array()) {
      if (text.is_string())
        texts.emplace_back(text.get_string());
      else
        fail(key);
    }
  return texts;
}

Headers KeyReader::headers(std::string_view key) {
  Headers headers;
  const auto* value = _value(key);
  if (value == nullptr) return headers;
  if (!value->is_object())
    fail(key);
  else
    for (const auto& [name, text] : value->get_object()) {
      if (text.is_string())
        headers.emplace_back(std::string(name), std::string(text.get_string()));
      else
        fail(key);
    }
  return headers;
}

const boost::json::value* KeyReader::_value(std::string_view key) {
  asked_.emplace(key);
  return object_.if_contains(key);
}

const std::string& KeyReader::finish() {
  for (const auto& member : object_) {
    if (!asked_.contains(member.key())) fail(member.key());
  }
  return wrong_;
}

void KeyReader::fail(std::string_view key) {
  if (wrong_.empty()) wrong_ = key;
}

}  // namespace sandbox
