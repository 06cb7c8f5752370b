#include <gtest/gtest.h>

#include "sandbox/search/AnswerCache.h"

namespace sandbox {

TEST(AnswerCacheTest, ForgetsWhatWasNotUsedForLongest) {
  AnswerCache cache(2);
  const auto answer = [](const char* text) {
    return Answer{std::make_shared<const std::string>(text), nullptr};
  };
  cache.insert("a", answer("1"));
  cache.insert("b", answer("2"));
  EXPECT_EQ(*cache.find("a")->body, "1");
  cache.insert("c", answer("3"));
  EXPECT_FALSE(cache.find("b"));
  cache.insert("a", answer("4"));
  EXPECT_EQ(*cache.find("a")->body, "4");
  EXPECT_TRUE(cache.find("c"));
  cache.clear();
  EXPECT_FALSE(cache.find("a"));
}

}  // namespace sandbox
