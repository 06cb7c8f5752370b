#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace sandbox {

// What a suggestion is about. The numbers are stored in the index.
enum class Kind : std::uint8_t {
  Word = 0,
  Country = 1,
  Region = 2,
  Currency = 3,
  Language = 4,
  Character = 5
};
inline constexpr int kKindCount = 6;

// "word", "country" ...
std::string_view nameOfKind(Kind kind);

// One thing that can be suggested.
struct Entry {
  std::int64_t id = 0;  // given by the index
  Kind kind = Kind::Word;
  std::string title;
  std::string description;
  std::string code;   // "FR", "FR-75", "EUR", "deu", "U+2665"; empty for words
  std::string glyph;  // a character or flag emoji to show; may be empty
  std::string flag;   // lower-case name of a flag image; may be empty
  // Popularity estimate in thousandths of a doubling: 1000 means twice as popular as 0.
  int weight = 0;
  // JSON array of {"label", "value"} for the card.
  std::string facts;
};

// One text under which an entry is found.
struct Alias {
  std::string text;
  int penalty = 0;  // taken off the entry's weight
};

// What a reader of a data source yields.
struct SourceEntry {
  Entry entry;
  // Besides the title.
  std::vector<Alias> aliases;
  // Whether the entry is also found by the words inside its texts.
  bool findByInnerWords = true;
};

}  // namespace sandbox
