#include "sandbox/data/WordNetReader.h"

#include <algorithm>
#include <array>
#include <boost/json/array.hpp>
#include <boost/json/object.hpp>
#include <boost/json/serialize.hpp>
#include <charconv>
#include <cmath>
#include <map>
#include <optional>
#include <unordered_map>
#include <vector>

#include "sandbox/core/Files.h"
#include "sandbox/core/Text.h"

namespace sandbox {

namespace {

constexpr std::size_t kParts = 4;
constexpr std::array<const char*, kParts> kPartFiles = {"noun", "verb", "adj", "adv"};
constexpr std::array<const char*, kParts> kPartNames = {"noun", "verb", "adjective", "adverb"};
constexpr std::size_t kSensesOfPart = 4;

using TagCounts = std::array<int, kParts>;

struct Synset {
  std::vector<std::string_view> words;
  std::string_view gloss;
};

struct Lemma {
  std::array<std::vector<std::size_t>, kParts> senses;  // offsets into the part's data file
};

std::size_t numberOf(std::string_view digits, int base = 10) {
  std::size_t number = 0;
  std::from_chars(digits.data(), digits.data() + digits.size(), number, base);
  return number;
}

// Adjectives carry their syntactic position: "galore(ip)".
std::string_view withoutMarker(std::string_view word) { return word.substr(0, word.find('(')); }

std::string titleOf(std::string_view word) {
  std::string title(word);
  std::replace(title.begin(), title.end(), '_', ' ');
  return title;
}

// The dictionary as files in memory and lemmas in order.
class WordNetFiles final {
 public:
  explicit WordNetFiles(const std::filesystem::path& folder) {
    for (std::size_t part = 0; part < kParts; ++part) {
      data_[part] = readFile(folder / (std::string("data.") + kPartFiles[part])).value_or("");
      index_[part] = readFile(folder / (std::string("index.") + kPartFiles[part])).value_or("");
      _readIndex(part);
    }
    counts_ = readFile(folder / "cntlist.rev").value_or("");
    _readCounts();
  }

  const std::map<std::string_view, Lemma>& lemmas() const { return lemmas_; }

  TagCounts tagCounts(std::string_view lemma) const {
    const auto found = tags_.find(lemma);
    return found == tags_.end() ? TagCounts{} : found->second;
  }

  // "offset file type count(hex) word id [word id ...] pointers | gloss"
  std::optional<Synset> synsetAt(std::size_t part, std::size_t offset) const {
    if (offset >= data_[part].size()) return std::nullopt;
    std::string_view line = std::string_view(data_[part]).substr(offset);
    line = line.substr(0, line.find('\n'));
    const std::size_t bar = line.find(" | ");
    const auto fields = split(line.substr(0, bar), ' ');
    if (bar == std::string_view::npos || fields.size() < 6) return std::nullopt;
    Synset synset{{}, line.substr(bar + 3)};
    const std::size_t count = numberOf(fields[3], 16);
    for (std::size_t word = 0; word < count && 4 + 2 * word < fields.size(); ++word) {
      synset.words.push_back(withoutMarker(fields[4 + 2 * word]));
    }
    while (!synset.gloss.empty() && synset.gloss.back() == ' ') synset.gloss.remove_suffix(1);
    return synset;
  }

 private:
  // "lemma pos synset_count pointer_count [pointer ...] sense_count tagged_count offset ..."
  void _readIndex(std::size_t part) {
    for (const std::string_view line : split(index_[part], '\n')) {
      if (line.empty() || line.front() == ' ') continue;
      const auto fields = split(line, ' ');
      if (fields.size() < 7) continue;
      const std::size_t count = numberOf(fields[2]);
      const std::size_t first = 6 + numberOf(fields[3]);
      auto& senses = lemmas_[fields[0]].senses[part];
      for (std::size_t sense = 0;
           sense < std::min(count, kSensesOfPart) && first + sense < fields.size(); ++sense) {
        senses.push_back(numberOf(fields[first + sense]));
      }
    }
  }

  // "lemma%part:... sense_number tag_count"; part 5 are adjectives too.
  void _readCounts() {
    for (const std::string_view line : split(counts_, '\n')) {
      const std::size_t mark = line.find('%');
      if (mark == std::string_view::npos || mark + 1 >= line.size()) continue;
      const char type = line[mark + 1];
      const std::size_t part = type == '5' ? 2 : static_cast<std::size_t>(type - '1');
      if (part >= kParts) continue;
      tags_[line.substr(0, mark)][part] +=
          static_cast<int>(numberOf(line.substr(line.rfind(' ') + 1)));
    }
  }

  std::array<std::string, kParts> data_;
  std::array<std::string, kParts> index_;
  std::string counts_;
  std::map<std::string_view, Lemma> lemmas_;
  std::unordered_map<std::string_view, TagCounts> tags_;
};

// Parts of speech of the lemma, the most frequent first.
std::vector<std::size_t> partsInOrder(const Lemma& lemma, const TagCounts& tags) {
  std::vector<std::size_t> parts;
  for (std::size_t part = 0; part < kParts; ++part) {
    if (!lemma.senses[part].empty()) parts.push_back(part);
  }
  std::stable_sort(parts.begin(), parts.end(), [&](auto a, auto b) { return tags[a] > tags[b]; });
  return parts;
}

// Tagged lemmas gain a doubling's worth for each doubling of the count, many senses a little.
int weightOfLemma(const Lemma& lemma, const TagCounts& tags) {
  int total = 0;
  int senses = 0;
  for (std::size_t part = 0; part < kParts; ++part) {
    total += tags[part];
    senses += static_cast<int>(lemma.senses[part].size());
  }
  return static_cast<int>(1000 * std::log2(1 + total)) + 150 * senses;
}

std::string_view spelling(const Synset& synset, std::string_view lemma) {
  for (const auto word : synset.words) {
    if (lowerCased(word) == lemma) return word;
  }
  return lemma;
}

SourceEntry entryOf(const WordNetFiles& files, std::string_view text, const Lemma& lemma) {
  const TagCounts tags = files.tagCounts(text);
  SourceEntry source;
  source.entry.kind = Kind::Word;
  source.entry.weight = weightOfLemma(lemma, tags);
  boost::json::array facts;
  for (const std::size_t part : partsInOrder(lemma, tags)) {
    for (const std::size_t offset : lemma.senses[part]) {
      const auto synset = files.synsetAt(part, offset);
      if (!synset) continue;
      if (facts.empty()) {
        source.entry.title = titleOf(spelling(*synset, text));
        source.entry.description = std::string(kPartNames[part]) + " · ";
        source.entry.description += synset->gloss.substr(0, synset->gloss.find("; \""));
      }
      facts.push_back(boost::json::object{{"label", kPartNames[part]}, {"value", synset->gloss}});
    }
  }
  source.entry.facts = boost::json::serialize(facts);
  return source;
}

}  // namespace

void readWordNet(const std::filesystem::path& folder,
                 const std::function<void(SourceEntry)>& yield) {
  const WordNetFiles files(folder);
  for (const auto& [text, lemma] : files.lemmas()) {
    SourceEntry source = entryOf(files, text, lemma);
    if (!source.entry.title.empty()) yield(std::move(source));
  }
}

}  // namespace sandbox
