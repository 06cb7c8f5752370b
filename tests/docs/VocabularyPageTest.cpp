#include <gmock/gmock.h>

#include <fstream>
#include <map>
#include <sstream>

#include "halvane/Vocabulary.h"

namespace zelkord {
namespace {

// The section of the page after its heading.
std::string vocabularySection() {
  std::ifstream page(ZK_SOURCE_DIR "/docs/formats/feedback.md");
  const std::string text{std::istreambuf_iterator<char>(page), {}};
  const auto begin = text.find("\n## Vocabulary\n");
  return begin == std::string::npos ? "" : text.substr(begin);
}

using Names = std::vector<std::string>;

Names splitAtCommas(const std::string& text) {
  Names names;
  for (std::size_t at = 0; at < text.size();) {
    const auto end = std::min(text.find(", ", at), text.size());
    names.push_back(text.substr(at, end - at));
    at = end + 2;
  }
  return names;
}

std::map<std::string, Names> documentedVocabulary() {
  std::istringstream section(vocabularySection());
  std::map<std::string, Names> tables;
  for (std::string line; std::getline(section, line);) {
    if (!line.starts_with("| ") || line.starts_with("| Enumeration")) continue;
    const auto bar = line.find(" | ", 2);
    tables[line.substr(2, bar - 2)] = splitAtCommas(line.substr(bar + 3, line.size() - bar - 5));
  }
  return tables;
}

template <std::size_t Count>
Names namesIn(const std::array<std::string_view, Count>& table) {
  return {table.begin(), table.end()};
}

TEST(VocabularyPageTest, EveryNameIsSentForTheValueThatThePageGives) {
  using namespace vocabulary;
  const std::map<std::string, Names> expected = {
      {"result engagement trigger", namesIn(kEventTypes)},
      {"engagement destination", namesIn(kDestinationTypes)},
      {"result action target", namesIn(kActionTargetTypes)},
      {"result type", namesIn(kResultTypes)},
      {"top hit", namesIn(kTopHitTypes)},
      {"search view appear", namesIn(kViewAppearEvents)},
      {"search view disappear", namesIn(kViewDisappearEvents)},
      {"card view disappear", namesIn(kCardViewDisappearEvents)},
      {"search request trigger", namesIn(kSearchRequestTriggers)},
      {"endpoint type", namesIn(kEndpointTypes)},
      {"lookup selection", namesIn(kLookupSelectionTypes)},
      {"local index", namesIn(kIndexTypes)},
      {"visible results trigger", namesIn(kVisibleResultsEvents)},
      {"card section trigger", namesIn(kCardSectionEvents)},
      {"card type", namesIn(kCardTypes)},
      {"card action target", namesIn(kCardActionTargets)},
      {"store product page", namesIn(kProductPageResults)},
      {"suggestion type", namesIn(kSuggestionTypes)},
      {"clear input trigger", namesIn(kClearInputEvents)},
      {"section engagement trigger", namesIn(kSectionEngagementEvents)},
      {"section header type", namesIn(kHeaderTypes)},
      {"skip search reason", namesIn(kSkipSearchReasons)},
      {"result grade", namesIn(kResultGrades)},
  };
  EXPECT_EQ(documentedVocabulary(), expected);
}

TEST(VocabularyPageTest, PlaceCardsHaveNamesForTheValuesOfThePage) {
  Names named;
  const auto& table = vocabulary::kMapsFeedbackTypes;
  for (std::size_t i = 0; i < table.size(); ++i) {
    if (!table[i].empty()) named.push_back(std::to_string(i) + " " + std::string(table[i]));
  }
  const auto section = vocabularySection();
  const auto begin = section.find("\n0 ");
  ASSERT_NE(begin, std::string::npos);
  EXPECT_EQ(splitAtCommas(section.substr(begin + 1, section.find('\n', begin + 1) - begin - 1)),
            named);
}

}  // namespace
}  // namespace zelkord
