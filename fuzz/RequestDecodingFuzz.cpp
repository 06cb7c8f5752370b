// Lines of text as what a client asks: the kind in the first line, then a value a line with its
// key, the letter of its type and its text. What is taken keeps every limit of the interface.

#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>
#include <variant>

#include "base/Check.h"
#include "base/Text.h"
#include "zelkord/core/Wire.h"

namespace zelkord {
namespace {

std::string takeUpTo(std::string_view& text, char end) {
  const auto part = text.substr(0, text.find(end));
  text.remove_prefix(std::min(part.size() + 1, text.size()));
  return std::string(part);
}

// As many pairs as the text has pieces between commas, each with its own text on both sides.
ipc::StringPairs pairsOf(std::string_view text) {
  ipc::StringPairs pairs;
  while (!text.empty() && pairs.size() < 1000) {
    const auto piece = takeUpTo(text, ',');
    pairs.emplace_back(piece, piece);
  }
  return pairs;
}

ipc::Value valueOf(char type, const std::string& text) {
  switch (type) {
    case 'b':
      return text == "1";
    case 'u':
      return static_cast<std::uint32_t>(std::strtoul(text.c_str(), nullptr, 0));
    case 'x':
      return static_cast<std::int64_t>(std::strtoll(text.c_str(), nullptr, 0));
    case 't':
      return static_cast<std::uint64_t>(std::strtoull(text.c_str(), nullptr, 0));
    case 'd':
      return std::strtod(text.c_str(), nullptr);
    case 'y':
      return Data(text);
    case 'p':
      return pairsOf(text);
    case 'v':
      return ipc::Dictionary{{text, text}};
    default:
      return text;
  }
}

ipc::Dictionary dictionaryOf(std::string_view lines) {
  ipc::Dictionary dictionary;
  while (!lines.empty()) {
    const auto line = takeUpTo(lines, '\n');
    std::string_view rest = line;
    const auto key = takeUpTo(rest, ' ');
    const auto type = takeUpTo(rest, ' ');
    dictionary[key] = valueOf(type.empty() ? 's' : type.front(), std::string(rest));
  }
  return dictionary;
}

template <typename T>
const T* taken(const Decoded<T>& decoded) {
  const auto* fault = std::get_if<WireFault>(&decoded);
  ZK_CHECK(!fault || !fault->text.empty(), "a refusal says why");
  ZK_CHECK(
      !fault || fault->errorName == ipc::kInvalidArgs || fault->errorName == ipc::kLimitsExceeded,
      "one of two errors");
  return std::get_if<T>(&decoded);
}

void checkRequest(const ZLKRequest& request) {
  ZK_CHECK(request.triggerEvent <= 19, "a trigger event of the table");
  ZK_CHECK(std::isfinite(request.scale) && request.scale >= 0, "a scale");
  ZK_CHECK(request.queryItems.size() <= 256, "not too many items");
  for (const auto& [name, value] : request.queryItems) {
    ZK_CHECK(!hasControlCharacters(name) && !hasControlCharacters(value), "plain items");
  }
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  std::string_view text(reinterpret_cast<const char*>(data), size);
  if (!isValidUtf8(text)) return 0;  // the transport takes no other texts
  const auto kind = takeUpTo(text, '\n');
  const auto dictionary = dictionaryOf(text);
  const auto decoded = decodeRequest(kind, dictionary);
  if (const auto* request = taken(decoded); request && *request) checkRequest(**request);
  const auto configuration = decodeConfiguration(dictionary);
  if (const auto* read = taken(configuration)) {
    ZK_CHECK(!hasControlCharacters(read->identifier) && !hasControlCharacters(read->userAgent),
             "plain names");
  }
  const auto count = std::min<std::size_t>(kind.size(), 1100);
  const auto images = decodeImageDescriptors(std::vector<ipc::Dictionary>(count, dictionary));
  if (const auto* read = taken(images)) {
    ZK_CHECK(read->size() == count && count <= 1000, "each descriptor once");
  }
  return 0;
}
