#include <gmock/gmock.h>

#include "platform/linux/tagger/LinuxTagger.h"

namespace zelkord {
namespace {

std::string repeated(const std::string& text, int times) {
  std::string all;
  for (int i = 0; i < times; ++i) all += text;
  return all;
}

TEST(LinuxTaggerTest, KnowsTheLanguageOfTheStart) {
  const std::string english = "The weather is nice today and we want to go out for a walk. ";
  const auto french = repeated(
      "Le chat dort sur la chaise pendant que les enfants jouent dans le jardin avec leurs amis. ",
      12);
  const auto german = repeated(
      "Der Hund schläft unter dem Tisch, während die Kinder mit ihren Freunden spielen. ", 12);
  const std::pair<std::string, const char*> cases[] = {
      {"Where can I find a good restaurant near the railway station tonight?", "en"},
      {"Wo finde ich heute Abend ein gutes Restaurant in der Nähe des Bahnhofs?", "de"},
      {"今日の夜、駅の近くで美味しいレストランを探しています。", "ja"},
      {"איפה אפשר למצוא מסעדה טובה ליד תחנת הרכבת הערב?", "he"},
      {english + french, "en"},
      {english + german, "en"},
      {"What is the time? " + french, "en"},
      {"The quick brown fox " + german, "en"},
      {"  \n\tPlease call me back. " + german, "en"},
      {"Où est la gare? " + repeated(english, 12), "fr"},
      {"Погода в Москве сегодня. " + repeated(english, 12), "ru"},
      {"東京の天気 " + repeated(english, 12), "ja"},
      {"\U0001F600 " + english + french, "en"},
      {french + english, "fr"},
      {"Paris. " + french, "fr"},
      {"42 " + german, "de"},
      {repeated("今日の夜、駅の近くで美味しいレストランを探しています。", 20), "ja"},
      {"where is it", "en"},
      {"Bonjour le monde", "fr"},
      {"안녕하세요", "ko"},
      {"สวัสดี", "th"},
      {"x", "und"},
      {"\U0001F600", "und"},
      {"", "und"},
      {"12345 67890", "und"},
      {"\xFF\xFE", "und"},
  };
  const LinuxTagger tagger;
  for (const auto& [text, language] : cases) {
    EXPECT_EQ(tagger.languageAtStart(text), language) << text.substr(0, 60);
  }
}

}  // namespace
}  // namespace zelkord
