#include "platform/linux/property_list/BinaryPropertyLists.h"

#include <plist/plist.h>

#include <cerrno>
#include <cmath>
#include <cstdlib>
#include <memory>

#include "base/Text.h"
#include "platform/linux/property_list/BinaryPropertyListCheck.h"
#include "platform/linux/property_list/PropertyListReader.h"

namespace zelkord {
namespace {

using PlistPointer = std::unique_ptr<void, decltype(&plist_free)>;

Error plistError(std::string reason) {
  auto error = posixError(EINVAL);
  error.userInfo["reason"] = std::move(reason);
  return error;
}

// Makes the tree of a JSON value; `problem` is set once something cannot be written.
class PlistWriter {
 public:
  // Null for a value that is dropped.
  plist_t write(const json::value& value, std::size_t depth) {
    if (depth > kMaximumJsonDepth) return _fail("nested too deep");
    switch (value.kind()) {
      case json::kind::null:
        return nullptr;
      case json::kind::bool_:
        return plist_new_bool(value.get_bool() ? 1 : 0);
      case json::kind::int64:
        return plist_new_uint(static_cast<std::uint64_t>(value.get_int64()));
      case json::kind::uint64:
        return _writeUnsigned(value.get_uint64());
      case json::kind::double_:
        return _writeReal(value.get_double());
      case json::kind::string:
        return _writeText(value.get_string());
      case json::kind::array:
        return _writeArray(value.get_array(), depth);
      case json::kind::object:
        return writeDictionary(value.get_object(), depth);
    }
    return nullptr;
  }

  plist_t writeDictionary(const json::object& object, std::size_t depth) {
    const plist_t dictionary = plist_new_dict();
    for (const auto& [key, value] : object) {
      if (!_isWritable(key)) break;
      if (const plist_t child = write(value, depth + 1)) {
        plist_dict_set_item(dictionary, std::string(key).c_str(), child);
      }
    }
    return dictionary;
  }

  const std::string& problem() const { return problem_; }

 private:
  plist_t _fail(const char* problem) {
    if (problem_.empty()) problem_ = problem;
    return nullptr;
  }

  // The library takes zero-terminated text and stops at what is not UTF-8.
  bool _isWritable(std::string_view text) {
    if (text.find('\0') != std::string_view::npos) _fail("a text holds a zero character");
    if (!isValidUtf8(text)) _fail("a text is not UTF-8");
    return problem_.empty();
  }

  plist_t _writeUnsigned(std::uint64_t number) {
    if (number <= INT64_MAX) return plist_new_uint(number);
    return plist_new_real(static_cast<double>(number));
  }
  plist_t _writeReal(double number) {
    return std::isfinite(number) ? plist_new_real(number) : nullptr;
  }
  plist_t _writeText(std::string_view text) {
    return _isWritable(text) ? plist_new_string(std::string(text).c_str()) : nullptr;
  }
  plist_t _writeArray(const json::array& elements, std::size_t depth) {
    const plist_t array = plist_new_array();
    for (const auto& element : elements) {
      if (const plist_t child = write(element, depth + 1)) plist_array_append_item(array, child);
    }
    return array;
  }

  std::string problem_;
};

}  // namespace

std::optional<std::string> BinaryPropertyLists::encode(const json::object& dictionary,
                                                       Error* error) const {
  PlistWriter writer;
  const PlistPointer tree(writer.writeDictionary(dictionary, 1), plist_free);
  if (writer.problem().empty()) {
    char* bytes = nullptr;
    std::uint32_t size = 0;
    plist_to_bin(tree.get(), &bytes, &size);
    const std::unique_ptr<char, decltype(&std::free)> owner(bytes, std::free);
    if (bytes) return std::string(bytes, size);
  }
  if (error) *error = plistError(writer.problem().empty() ? "too large" : writer.problem());
  return std::nullopt;
}

std::optional<json::value> BinaryPropertyLists::decode(std::string_view bytes, Error* error) const {
  auto problem = bytes.size() > UINT32_MAX ? "too large" : checkBinaryPropertyList(bytes);
  if (problem.empty()) {
    plist_t raw = nullptr;
    plist_from_bin(bytes.data(), static_cast<std::uint32_t>(bytes.size()), &raw);
    const PlistPointer tree(raw, plist_free);
    auto value = tree ? jsonOfPropertyList(tree.get()) : std::nullopt;
    if (value) return value;
    problem = "broken object";
  }
  if (error) *error = plistError("not a binary property list: " + problem);
  return std::nullopt;
}

}  // namespace zelkord
