#include <gtest/gtest.h>

#include <boost/smart_ptr/intrusive_ref_counter.hpp>
#include <map>
#include <random>
#include <string>
#include <vector>

#include "zelkord/resources/CritbitTree.h"

namespace zelkord {
namespace {

struct Counted : boost::intrusive_ref_counter<Counted> {
  explicit Counted(int tag) : number(tag) {}
  int number;
};
using CountedTree = CritbitTree<Counted>;
using CountedPointer = CountedTree::Pointer;

std::vector<std::string> keysWithPrefix(const CountedTree& tree, std::string_view prefix) {
  std::vector<std::string> keys;
  tree.keysMatchingPrefix(prefix,
                          [&](std::string_view key, Counted&, bool&) { keys.emplace_back(key); });
  return keys;
}

CountedTree::Pointer counted(int number) { return CountedPointer(new Counted(number)); }

TEST(CritbitTreeTest, WalksPrefixesInAscendingByteOrder) {
  CountedTree tree;
  for (const auto* key : {"ab", "b", "a", "\xC3\xA9", "abc", "az", ""})
    EXPECT_TRUE(tree.setObject(counted(0), key));
  using Keys = std::vector<std::string>;
  const std::vector<std::pair<std::string, Keys>> cases = {
      {"", {"", "a", "ab", "abc", "az", "b", "\xC3\xA9"}},
      {"a", {"a", "ab", "abc", "az"}},
      {"ab", {"ab", "abc"}},
      {"abcd", {}},
      {"c", {}},
      {"\xC3", {"\xC3\xA9"}}};
  for (const auto& [prefix, expected] : cases) {
    SCOPED_TRACE(prefix);
    EXPECT_EQ(keysWithPrefix(tree, prefix), expected);
  }
}

TEST(CritbitTreeTest, StopsTheWalkWhenAsked) {
  CountedTree tree;
  for (const auto* key : {"a", "b", "c"}) tree.setObject(counted(0), key);
  int visited = 0;
  tree.keysMatchingPrefix("",
                          [&](std::string_view, Counted&, bool& stop) { stop = ++visited == 2; });
  EXPECT_EQ(visited, 2);
}

TEST(CritbitTreeTest, HoldsOneReferenceToEachValue) {
  const auto first = counted(1);
  const auto second = counted(2);
  {
    CountedTree tree;
    EXPECT_TRUE(tree.setObject(first, "key"));
    EXPECT_EQ(first->use_count(), 2u);
    EXPECT_FALSE(tree.setObject(first, "key"));
    EXPECT_EQ(first->use_count(), 2u);
    EXPECT_TRUE(tree.setObject(second, "key"));
    EXPECT_EQ(first->use_count(), 1u);
    EXPECT_EQ(second->use_count(), 2u);
    EXPECT_EQ(tree.count(), 1u);
    tree.removeObjectForKey("absent");
    EXPECT_EQ(tree.count(), 1u);
    tree.removeObjectForKey("key");
    EXPECT_EQ(second->use_count(), 1u);
    EXPECT_EQ(tree.count(), 0u);
    tree.setObject(second, "again");
  }
  EXPECT_EQ(second->use_count(), 1u);
}

TEST(CritbitTreeTest, RefusesKeysWithZeroBytes) {
  CountedTree tree;
  EXPECT_FALSE(tree.setObject(counted(1), std::string_view("a\0b", 3)));
  EXPECT_EQ(tree.count(), 0u);
  tree.setObject(counted(1), "a");
  EXPECT_EQ(tree.objectForKey(std::string_view("a\0b", 3)), nullptr);
  EXPECT_TRUE(keysWithPrefix(tree, std::string_view("a\0b", 3)).empty());
  tree.removeObjectForKey(std::string_view("a\0b", 3));
  EXPECT_EQ(tree.count(), 1u);
}

TEST(CritbitTreeTest, KeysThatExtendEachOtherVeryOftenNeedNoDeepStack) {
  CountedTree tree;
  std::string key;
  for (int i = 0; i < 3'000; ++i) tree.setObject(counted(i), key += 'x');
  EXPECT_EQ(keysWithPrefix(tree, "x").size(), 3'000u);
}

// The tree against std::map over random operations on keys that share many prefixes.
TEST(CritbitTreeTest, AgreesWithAnOrderedMap) {
  const auto seed = std::random_device()();
  SCOPED_TRACE(testing::Message() << "seed " << seed);
  std::mt19937 random(seed);
  const auto randomKey = [&] {
    std::string key(random() % 6, 'a');
    for (auto& c : key) c = "ab\x01\x7F\x80\xFF"[random() % 6];
    return key;
  };
  CountedTree tree;
  std::map<std::string, CountedPointer> model;
  for (int step = 0; step < 20'000; ++step) {
    const auto key = randomKey();
    if (random() % 3 != 0) {
      const auto value = counted(step);
      tree.setObject(value, key);
      model[key] = value;
    } else {
      tree.removeObjectForKey(key);
      model.erase(key);
    }
    ASSERT_EQ(tree.count(), model.size());
    const auto found = model.find(key);
    ASSERT_EQ(tree.objectForKey(key), found == model.end() ? nullptr : found->second);
    if (step % 97 != 0) continue;
    const auto prefix = randomKey().substr(0, 2);
    std::vector<std::string> expected;
    for (auto at = model.lower_bound(prefix); at != model.end() && at->first.starts_with(prefix);
         ++at) {
      expected.push_back(at->first);
    }
    ASSERT_EQ(keysWithPrefix(tree, prefix), expected);
  }
}

}  // namespace
}  // namespace zelkord
