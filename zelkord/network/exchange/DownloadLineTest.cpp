#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "zelkord/network/exchange/DownloadLine.h"

namespace zelkord {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using Connections = DownloadLine::Connections;

class DownloadLineTest : public testing::Test {
 protected:
  using Ids = std::vector<DownloadLine::Id>;

  // Named by the host and a number from 0.
  Ids add(const std::string& host, std::size_t count) {
    Ids added;
    for (std::size_t i = 0; i < count; ++i) {
      names_.push_back(host + std::to_string(counts_[host]++));
      added.push_back(names_.size() - 1);
      line_.add(host, added.back());
    }
    return added;
  }
  // Which ones begin now.
  std::vector<std::string> begin() { return namesOf(line_.takeDue()); }
  std::vector<std::string> namesOf(const Ids& ids) const {
    std::vector<std::string> names;
    for (const auto id : ids) names.push_back(names_.at(id));
    return names;
  }
  std::size_t abandonAll(const Ids& ids) {
    std::size_t dropped = 0;
    for (const auto id : ids) dropped += line_.abandon(id).size();
    return dropped;
  }

  DownloadLine line_;
  std::map<std::string, std::size_t> counts_;
  std::vector<std::string> names_;
};

TEST_F(DownloadLineTest, BeginsInOrderAsOthersEnd) {
  add("a", DownloadLine::kMostOfOneHost + 2);
  const auto first = begin();
  ASSERT_EQ(first.size(), DownloadLine::kMostOfOneHost);
  EXPECT_EQ(first.front(), "a0");
  EXPECT_EQ(first.back(), "a15");
  EXPECT_THAT(begin(), IsEmpty());
  line_.ended("a", Connections::OneEach);
  EXPECT_THAT(begin(), ElementsAre("a16"));
  line_.ended("elsewhere", Connections::OneEach);
  EXPECT_THAT(begin(), IsEmpty());
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
  EXPECT_THAT(begin(), ElementsAre("i4", "j4"));
}

TEST_F(DownloadLineTest, AHostFindsPlacesThoughOthersHoldTheTotal) {
  for (const char* host : {"a", "b", "c", "d"}) add(host, 100);
  EXPECT_EQ(begin().size(), DownloadLine::kMostUnderWay);
  add("good", 6);
  EXPECT_THAT(begin(), ElementsAre("good0", "good1", "good2", "good3"));
  line_.ended("good", Connections::OneEach);
  EXPECT_THAT(begin(), ElementsAre("good4"));
  std::size_t more = 0;
  for (char host = 'e'; host < 'z'; ++host) {
    add(std::string(1, host), 5);
    more += begin().size();
  }
  EXPECT_EQ(DownloadLine::kMostUnderWay + 4 + more, DownloadLine::kMostWithOwnPlaces);
}

TEST_F(DownloadLineTest, WhatNobodyWaitsForBeginsLastUnlessItIsWantedAgain) {
  const auto left = add("a", 20);
  begin();
  line_.abandon(left.at(3));  // has begun
  for (const auto id : {left.at(16), left.at(17), left.at(18)}) {
    EXPECT_THAT(line_.abandon(id), IsEmpty());
  }
  line_.want(left.at(17));
  add("a", 1);
  std::vector<std::string> order;
  for (int i = 0; i < 6; ++i) {
    line_.ended("a", Connections::OneEach);
    for (auto& name : begin()) order.push_back(std::move(name));
  }
  EXPECT_THAT(order, ElementsAre("a19", "a17", "a20", "a16", "a18"));
}

TEST_F(DownloadLineTest, KeepsFewOfWhatNobodyWaitsFor) {
  add("a", DownloadLine::kMostOfOneHost);
  begin();
  const auto ids = add("a", 1000);
  EXPECT_EQ(abandonAll(ids), 1000 - DownloadLine::kMostAbandonedOfOneHost);
  EXPECT_FALSE(line_.isWaiting(ids.front()));
  EXPECT_TRUE(line_.isWaiting(ids.back()));
  std::size_t kept = DownloadLine::kMostAbandonedOfOneHost;
  for (int i = 0; i < 20; ++i) kept += 60 - abandonAll(add("b" + std::to_string(i), 60));
  EXPECT_EQ(kept, DownloadLine::kMostAbandoned);
  EXPECT_EQ(line_.dropAbandoned("b19").size(), 60u);
  EXPECT_THAT(line_.dropAbandoned("b19"), IsEmpty());
}

}  // namespace
}  // namespace zelkord
