#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>

#include "zelkord/network/DownloadLine.h"

namespace zelkord {
namespace {

using Connections = DownloadLine::Connections;

class DownloadLineTest : public testing::Test {
 protected:
  void add(const std::string& host, std::size_t count) {
    for (std::size_t i = 0; i < count; ++i) {
      ASSERT_TRUE(line_.add(host, [this, host, i] { begun_.push_back(host + std::to_string(i)); }));
    }
  }
  // Which ones begin now.
  std::vector<std::string> begin() {
    begun_.clear();
    for (const auto& one : line_.takeDue()) one();
    return begun_;
  }

  DownloadLine line_;
  std::vector<std::string> begun_;
};

TEST_F(DownloadLineTest, BeginsInOrderAsOthersEnd) {
  add("a", DownloadLine::kMostOfOneHost + 2);
  const auto first = begin();
  ASSERT_EQ(first.size(), DownloadLine::kMostOfOneHost);
  EXPECT_EQ(first.front(), "a0");
  EXPECT_EQ(first.back(), "a15");
  EXPECT_THAT(begin(), testing::IsEmpty());
  line_.ended("a", Connections::OneEach);
  EXPECT_THAT(begin(), testing::ElementsAre("a16"));
  line_.ended("elsewhere", Connections::OneEach);
  EXPECT_THAT(begin(), testing::IsEmpty());
}

TEST_F(DownloadLineTest, AsksMoreOfAHostThatSharesItsConnectionWhileItIsBusy) {
  add("a", 100);
  EXPECT_EQ(begin().size(), DownloadLine::kMostOfOneHost);
  line_.ended("a", Connections::Shared);
  EXPECT_EQ(begin().size(),
            DownloadLine::kMostOnSharedConnection - DownloadLine::kMostOfOneHost + 1);
  for (int i = 0; i < 100; ++i) {
    line_.ended("a", Connections::OneEach);
    begin();
  }
  add("a", 100);
  EXPECT_EQ(begin().size(), DownloadLine::kMostOfOneHost);
}

TEST_F(DownloadLineTest, LetsHostsTakeTurnsWithinTheTotal) {
  for (const char* host : {"a", "b", "c", "d", "e", "f", "g", "h", "i", "j"}) add(host, 9);
  const auto first = begin();
  EXPECT_EQ(first.size(), DownloadLine::kMostUnderWay);
  for (const char* host : {"a3", "b3", "i3", "j3"}) {
    EXPECT_THAT(first, testing::Contains(host));
  }
  // The last turn was that of h.
  line_.ended("a", Connections::OneEach);
  line_.ended("b", Connections::OneEach);
  EXPECT_THAT(begin(), testing::ElementsAre("i4", "j4"));
}

TEST_F(DownloadLineTest, TakesNoMoreThanItsLength) {
  add("a", DownloadLine::kMostWaiting);
  EXPECT_FALSE(line_.add("b", [] {}));
  begin();
  EXPECT_TRUE(line_.add("b", [] {}));
}

}  // namespace
}  // namespace zelkord
