#include <gtest/gtest.h>

#include "sandbox/core/Text.h"

namespace sandbox {

TEST(TextTest, FoldsWhatPeopleTypeAndWhatTheDataSaysToTheSameText) {
  struct Case {
    const char* text;
    const char* folded;
  };
  for (const auto& [text, folded] : std::initializer_list<Case>{{"Snow", "snow"},
                                                                {"  snow   white ", "snow white"},
                                                                {"Black_Forest", "black forest"},
                                                                {"t-shirt", "t shirt"},
                                                                {"Côte d’Ivoire", "cote d'ivoire"},
                                                                {"Co\xCC\x82te", "cote"},
                                                                {"STRAẞE", "strasse"},
                                                                {"Łódź", "lodz"},
                                                                {"Ångström", "angstrom"},
                                                                {"ﬁlm", "film"},
                                                                {"雪", "雪"},
                                                                {"a\xFF", "a\uFFFD"},
                                                                {"", ""}}) {
    SCOPED_TRACE(text);
    EXPECT_EQ(foldTerm(text), folded);
  }
}

TEST(TextTest, ABlankThatEndsAWordBeingTypedStays) {
  EXPECT_EQ(foldQuery("snow "), "snow ");
  EXPECT_EQ(foldQuery(" "), "");
}

}  // namespace sandbox
