#include "sandbox/data/UnicodeReader.h"

#include <boost/json/array.hpp>
#include <boost/json/object.hpp>
#include <boost/json/serialize.hpp>
#include <charconv>
#include <optional>
#include <unordered_map>

#include "sandbox/core/Files.h"
#include "sandbox/core/Text.h"

namespace sandbox {

namespace {

constexpr int kEmojiWeight = 5000;
constexpr int kSymbolWeight = 3500;
constexpr int kLetterWeight = 3000;
constexpr int kOtherWeight = -1500;
constexpr int kFormalNamePenalty = 800;

using EmojiNames = std::unordered_map<std::uint32_t, std::string>;

std::optional<std::uint32_t> hexNumber(std::string_view digits) {
  std::uint32_t number = 0;
  const auto [end, error] =
      std::from_chars(digits.data(), digits.data() + digits.size(), number, 16);
  if (error != std::errc() || end != digits.data() + digits.size()) return std::nullopt;
  return number;
}

// "2665 FE0F   ; fully-qualified   # X E0.6 heart suit", of emoji that are one character.
void readEmojiLine(std::string_view line, EmojiNames& names) {
  const std::size_t semicolon = line.find(';');
  const std::size_t hash = line.find("# ");
  if (semicolon == std::string_view::npos || hash == std::string_view::npos) return;
  std::string_view sequence = line.substr(0, line.find_last_not_of(' ', semicolon - 1) + 1);
  if (sequence.ends_with(" FE0F")) sequence.remove_suffix(5);
  const auto character = hexNumber(sequence);
  const auto words = split(line.substr(hash + 2), ' ');
  if (!character || words.size() < 3) return;
  names.emplace(*character,
                std::string(line.substr(static_cast<std::size_t>(words[2].data() - line.data()))));
}

EmojiNames readEmojiNames(const std::filesystem::path& file) {
  EmojiNames names;
  const std::string text = readFile(file).value_or("");
  for (const auto line : split(text, '\n')) {
    if (!line.empty() && line.front() != '#') readEmojiLine(line, names);
  }
  return names;
}

bool isShown(std::string_view name, std::string_view category) {
  if (name.empty() || name.front() == '<' || name.starts_with("CJK COMPATIBILITY IDEOGRAPH"))
    return false;
  return category.front() != 'C' && category.front() != 'M' && category.front() != 'Z';
}

// Scripts that few people type weigh less than everything with a plain name.
int weightOfCharacter(std::uint32_t character, bool emoji) {
  if (emoji) return kEmojiWeight;
  if (character >= 0x2000 && character < 0x2C00) return kSymbolWeight;
  if (character < 0x0530) return kLetterWeight;
  return kOtherWeight;
}

std::string codeOf(std::string_view hex) { return "U+" + std::string(hex); }

SourceEntry characterEntry(std::uint32_t character, const std::vector<std::string_view>& fields,
                           const EmojiNames& emoji) {
  const auto everyday = emoji.find(character);
  const bool isEmoji = everyday != emoji.end();
  SourceEntry source;
  source.entry = {.kind = Kind::Character,
                  .title = lowerCased(fields[1]),
                  .code = codeOf(fields[0]),
                  .glyph = utf8Of(character),
                  .weight = weightOfCharacter(character, isEmoji)};
  source.entry.description = source.entry.glyph + " · " + source.entry.code;
  source.findByInnerWords = source.entry.weight > kOtherWeight;
  source.aliases.push_back({source.entry.code, 0});
  if (isEmoji) {
    source.aliases.push_back({source.entry.title, kFormalNamePenalty});
    source.entry.title = everyday->second;
  }
  boost::json::array facts;
  facts.push_back(boost::json::object{{"label", "Code"}, {"value", source.entry.code}});
  facts.push_back(boost::json::object{{"label", "Name"}, {"value", fields[1]}});
  facts.push_back(boost::json::object{{"label", "Category"}, {"value", fields[2]}});
  source.entry.facts = boost::json::serialize(facts);
  return source;
}

}  // namespace

std::string utf8Of(std::uint32_t c) {
  const auto byte = [](std::uint32_t bits) { return static_cast<char>(bits); };
  const auto tail = [&](int shift) { return byte(0x80 | ((c >> shift) & 0x3F)); };
  if (c < 0x80) return {byte(c)};
  if (c < 0x800) return {byte(0xC0 | (c >> 6)), tail(0)};
  if (c >= 0xD800 && c < 0xE000) return {};
  if (c < 0x10000) return {byte(0xE0 | (c >> 12)), tail(6), tail(0)};
  if (c < 0x110000) return {byte(0xF0 | (c >> 18)), tail(12), tail(6), tail(0)};
  return {};
}

void readCharacters(const std::filesystem::path& folder,
                    const std::function<void(SourceEntry)>& yield) {
  const EmojiNames emoji = readEmojiNames(folder / "emoji/emoji-test.txt");
  const std::string text = readFile(folder / "UnicodeData.txt").value_or("");
  for (const auto line : split(text, '\n')) {
    const auto fields = split(line, ';');
    if (fields.size() < 3 || fields[2].empty() || !isShown(fields[1], fields[2])) continue;
    if (const auto character = hexNumber(fields[0]))
      yield(characterEntry(*character, fields, emoji));
  }
}

}  // namespace sandbox
