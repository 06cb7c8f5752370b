#pragma once

#include <unistd.h>

#include <atomic>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>

#include "sandbox/data/DataSources.h"
#include "sandbox/data/IndexBuilder.h"
#include "sandbox/search/SuggestionIndex.h"

namespace sandbox {

// A folder of a test's own, gone with it.
class TemporaryFolder final {
 public:
  TemporaryFolder() {
    std::string name = (std::filesystem::temp_directory_path() / "sandbox-XXXXXX").string();
    path_ = ::mkdtemp(name.data());
  }
  TemporaryFolder(const TemporaryFolder&) = delete;
  TemporaryFolder& operator=(const TemporaryFolder&) = delete;
  ~TemporaryFolder() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
  }
  const std::filesystem::path& path() const { return path_; }

 private:
  std::filesystem::path path_;
};

inline void writeTestFile(const std::filesystem::path& path, std::string_view content) {
  std::filesystem::create_directories(path.parent_path());
  std::ofstream(path, std::ios::binary) << content;
}

// A dictionary in the format of WordNet, added word by word.
class TinyDictionary final {
 public:
  // `tags`: how often the word was counted.
  void add(const std::string& word, const std::string& gloss, int tags) {
    char line[512];
    std::snprintf(line, sizeof line, "%08zu 03 n 01 %s 0 000 | %s  \n", data_.size(), word.c_str(),
                  gloss.c_str());
    char entry[256];
    std::snprintf(entry, sizeof entry, "%s n 1 0 1 1 %08zu  \n", _lower(word).c_str(),
                  data_.size());
    data_ += line;
    index_ += entry;
    if (tags > 0) counts_ += _lower(word) + "%1:03:00:: 1 " + std::to_string(tags) + "\n";
  }

  void write(const std::filesystem::path& folder) const {
    writeTestFile(folder / "data.noun", data_);
    writeTestFile(folder / "index.noun", index_);
    writeTestFile(folder / "cntlist.rev", counts_);
  }

 private:
  static std::string _lower(std::string text) {
    for (char& c : text) c = static_cast<char>(c >= 'A' && c <= 'Z' ? c + 32 : c);
    return text;
  }

  std::string data_ = "  1 the licence stands here\n";
  std::string index_ = "  1 the licence stands here\n";
  std::string counts_;
};

// A few words, countries and characters in the layout of /usr/share.
inline DataSources writeTinyData(const std::filesystem::path& root) {
  const DataSources sources(root);
  TinyDictionary words;
  words.add("snow",
            "precipitation falling from clouds in the form of ice crystals; \"it lay deep\"", 34);
  words.add("snowflake", "a crystal of snow", 2);
  words.add("snowman", "a figure of a person made of packed snow", 1);
  words.add("frame", "the framework for a pair of eyeglasses", 27);
  words.add("Black_Forest", "a hilly forest region in southwestern Germany", 0);
  words.add("heart", "the locus of feelings and intuitions", 84);
  for (int number = 0; number < 300; ++number)
    words.add("zz" + std::to_string(number), "filler", number % 7);
  words.write(sources.wordnet());
  writeTestFile(sources.isoCodes() / "iso_3166-1.json", R"({"3166-1": [
    {"alpha_2": "FR", "alpha_3": "FRA", "flag": "F", "name": "France", "numeric": "250", "official_name": "French Republic"},
    {"alpha_2": "CI", "alpha_3": "CIV", "name": "Côte d'Ivoire", "numeric": "384"},
    {"alpha_2": "KR", "alpha_3": "KOR", "name": "Korea, Republic of", "common_name": "South Korea", "numeric": "410"},
    {"alpha_2": 7, "name": 8}]})");
  writeTestFile(sources.isoCodes() / "iso_3166-2.json",
                R"({"3166-2": [{"code": "FR-75", "name": "Paris", "type": "Department"}]})");
  writeTestFile(sources.unicode() / "UnicodeData.txt",
                "0041;LATIN CAPITAL LETTER A;Lu;0;L;;;;;N;;;;0061;\n"
                "0301;COMBINING ACUTE ACCENT;Mn;230;NSM;;;;;N;;;;;\n"
                "03B1;GREEK SMALL LETTER ALPHA;Ll;0;L;;;;;N;;;0391;;0391\n"
                "03B2;GREEK SMALL LETTER BETA;Ll;0;L;;;;;N;;;0392;;0392\n"
                "2665;BLACK HEART SUIT;So;0;ON;;;;;N;;;;;\n"
                "2603;SNOWMAN;So;0;ON;;;;;N;;;;;\n"
                "not a line\n");
  writeTestFile(sources.unicode() / "emoji/emoji-test.txt",
                "# comment\n2665 FE0F    ; fully-qualified     # x E0.6 heart suit\n");
  writeTestFile(sources.flags() / "fr.png", "\x89PNG of France");
  return sources;
}

// The index of the tiny data, ready to be asked.
class TinyIndex final {
 public:
  TinyIndex()
      : sources_(writeTinyData(folder_.path() / "data")), pool_(folder_.path() / "index.db") {
    IndexBuilder::ensure(sources_, folder_.path() / "index.db");
    pool_.open();
  }

  SuggestionIndexPool& pool() { return pool_; }
  const DataSources& sources() const { return sources_; }
  const std::filesystem::path& folder() const { return folder_.path(); }

 private:
  TemporaryFolder folder_;
  DataSources sources_;
  SuggestionIndexPool pool_;
};

}  // namespace sandbox
