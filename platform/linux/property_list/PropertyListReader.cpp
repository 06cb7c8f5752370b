#include "platform/linux/property_list/PropertyListReader.h"

#include <openssl/evp.h>
#include <plist/plist.h>

#include <cmath>
#include <cstdlib>
#include <memory>

#include "base/Text.h"

namespace zelkord {
namespace {

// Dates count from the beginning of 2001.
constexpr double kPlistEpoch = 978307200;

using CText = std::unique_ptr<char, decltype(&std::free)>;

std::optional<json::value> readPlistReal(plist_t node) {
  double number = 0;
  plist_get_real_val(node, &number);
  if (!std::isfinite(number)) return std::nullopt;
  return number;
}

std::optional<json::value> readPlistText(plist_t node) {
  char* raw = nullptr;
  plist_get_string_val(node, &raw);
  const CText text(raw, std::free);
  if (!text || !isValidUtf8(raw)) return std::nullopt;
  return json::value(raw);
}

json::value readPlistDate(plist_t node) {
  std::int32_t seconds = 0;
  std::int32_t micros = 0;
  plist_get_date_val(node, &seconds, &micros);
  return kPlistEpoch + seconds + micros / 1e6;
}

json::value readPlistData(plist_t node) {
  char* raw = nullptr;
  std::uint64_t size = 0;
  plist_get_data_val(node, &raw, &size);
  const CText bytes(raw, std::free);
  if (!bytes || size == 0) return "";
  std::string text((size + 2) / 3 * 4 + 1, '\0');
  const int length =
      EVP_EncodeBlock(reinterpret_cast<unsigned char*>(text.data()),
                      reinterpret_cast<const unsigned char*>(raw), static_cast<int>(size));
  return json::value(std::string_view(text.data(), static_cast<std::size_t>(length)));
}

json::value readPlistArray(plist_t node) {
  json::array array;
  plist_array_iter raw = nullptr;
  plist_array_new_iter(node, &raw);
  const std::unique_ptr<void, decltype(&std::free)> iterator(raw, std::free);
  plist_t element = nullptr;
  for (plist_array_next_item(node, raw, &element); element;
       plist_array_next_item(node, raw, &element)) {
    if (auto value = jsonOfPropertyList(element)) array.push_back(std::move(*value));
  }
  return array;
}

json::value readPlistDictionary(plist_t node) {
  json::object object;
  plist_dict_iter raw = nullptr;
  plist_dict_new_iter(node, &raw);
  const std::unique_ptr<void, decltype(&std::free)> iterator(raw, std::free);
  while (true) {
    char* rawKey = nullptr;
    plist_t member = nullptr;
    plist_dict_next_item(node, raw, &rawKey, &member);
    const CText key(rawKey, std::free);
    if (!member) return object;
    if (!key || !isValidUtf8(rawKey)) continue;
    if (auto value = jsonOfPropertyList(member)) object.insert_or_assign(rawKey, std::move(*value));
  }
}

}  // namespace

std::optional<json::value> jsonOfPropertyList(void* node) {
  std::uint8_t flag = 0;
  std::uint64_t number = 0;
  switch (plist_get_node_type(node)) {
    case PLIST_BOOLEAN:
      plist_get_bool_val(node, &flag);
      return json::value(flag != 0);
    case PLIST_UINT:
      plist_get_uint_val(node, &number);
      return static_cast<std::int64_t>(number);
    case PLIST_REAL:
      return readPlistReal(node);
    case PLIST_STRING:
      return readPlistText(node);
    case PLIST_DATE:
      return readPlistDate(node);
    case PLIST_DATA:
      return readPlistData(node);
    case PLIST_ARRAY:
      return readPlistArray(node);
    case PLIST_DICT:
      return readPlistDictionary(node);
    default:
      return std::nullopt;  // UID nodes
  }
}

}  // namespace zelkord
