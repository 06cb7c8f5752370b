#include <gtest/gtest.h>

#include <map>

#include "sandbox/TestData.h"
#include "sandbox/data/IsoReader.h"
#include "sandbox/data/UnicodeReader.h"
#include "sandbox/data/WordNetReader.h"

namespace sandbox {

namespace {

using ReadEntries = std::map<std::string, SourceEntry>;

std::function<void(SourceEntry)> into(ReadEntries& entries) {
  return [&entries](SourceEntry source) { entries[source.entry.title] = std::move(source); };
}

}  // namespace

TEST(WordNetReaderTest, MergesThePartsOfSpeechOfALemmaTheMostFrequentFirst) {
  const TemporaryFolder folder;
  writeTestFile(folder.path() / "data.noun",
                "00000000 03 n 02 Run 0 score 0 000 | a score in baseball; \"two runs\"  \n");
  writeTestFile(folder.path() / "index.noun",
                "run n 1 0 1 1 00000000  \nbroken n 1\nfar n 1 0 1 1 99999999  \n");
  writeTestFile(folder.path() / "data.verb", "00000000 38 v 01 run 0 000 | move fast  \n");
  writeTestFile(folder.path() / "index.verb", "run v 1 0 1 1 00000000  \n");
  writeTestFile(folder.path() / "data.adj",
                "00000000 00 s 01 galore(ip) 0 000 | in great numbers  \n");
  writeTestFile(folder.path() / "index.adj", "galore a 1 0 1 0 00000000  \n");
  writeTestFile(folder.path() / "cntlist.rev",
                "run%1:04:00:: 1 3\nrun%2:38:00:: 1 12\nrun%9:38:00:: 1 12\nrun%\n");
  ReadEntries entries;
  readWordNet(folder.path(), into(entries));
  ASSERT_EQ(entries.size(), 2U);
  EXPECT_EQ(entries.at("run").entry.description, "verb · move fast");
  EXPECT_EQ(
      entries.at("run").entry.facts,
      R"([{"label":"verb","value":"move fast"},{"label":"noun","value":"a score in baseball; \"two runs\""}])");
  EXPECT_EQ(entries.at("run").entry.weight, 4300);
  EXPECT_EQ(entries.at("galore").entry.description, "adjective · in great numbers");
}

TEST(IsoReaderTest, PutsRegionsIntoTheirCountriesAndSkipsWhatIsMalformed) {
  const TemporaryFolder folder;
  const DataSources sources = writeTinyData(folder.path());
  writeTestFile(sources.isoCodes() / "iso_4217.json",
                "{\"4217\": [{\"alpha_3\": \"FRF\", \"name\": \"Franc\"}, 7, {}]}");
  writeTestFile(sources.isoCodes() / "iso_639-2.json", "[truncated");
  ReadEntries entries;
  readIsoCodes(sources.isoCodes(), sources.flags(), into(entries));
  EXPECT_EQ(entries.size(), 5U);
  EXPECT_EQ(entries.at("Paris").entry.description, "Department · France");
  EXPECT_EQ(entries.at("Paris").entry.flag, "fr");
  EXPECT_EQ(entries.at("Franc").entry.flag, "fr");
  EXPECT_EQ(entries.at("South Korea").entry.flag, "");
}

TEST(UnicodeReaderTest, NamesEmojiAsPeopleDoAndLeavesOutWhatCannotBeShown) {
  const TemporaryFolder folder;
  ReadEntries entries;
  readCharacters(writeTinyData(folder.path()).unicode(), into(entries));
  EXPECT_EQ(entries.size(), 5U);
  EXPECT_EQ(entries.at("heart suit").entry.glyph, "♥");
  EXPECT_GT(entries.at("heart suit").entry.weight, entries.at("snowman").entry.weight);
}

TEST(UnicodeReaderTest, EncodesAsUtf8) {
  for (const auto& [character, text] :
       std::initializer_list<std::pair<std::uint32_t, const char*>>{{0x41, "A"},
                                                                    {0x3B1, "α"},
                                                                    {0x2665, "♥"},
                                                                    {0x1F600, "😀"},
                                                                    {0x10FFFF, "\xF4\x8F\xBF\xBF"},
                                                                    {0xD800, ""},
                                                                    {0x110000, ""}}) {
    EXPECT_EQ(utf8Of(character), text);
  }
}

}  // namespace sandbox
