#include <gtest/gtest.h>

#include <boost/smart_ptr/intrusive_ref_counter.hpp>
#include <cstdlib>
#include <map>
#include <new>
#include <random>
#include <string>
#include <vector>

#include "zelkord/resources/CritbitTree.h"

// ThreadSanitizer's operator cannot be replaced.
#if defined(__has_feature)
#if __has_feature(thread_sanitizer)
#define ZK_ALLOCATIONS_CANNOT_FAIL
#endif
#endif

namespace {
// How many allocations still succeed; negative: all.
[[maybe_unused]] int allocationsLeft = -1;
}  // namespace

#ifndef ZK_ALLOCATIONS_CANNOT_FAIL
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
  if (allocationsLeft == 0) return nullptr;
  if (allocationsLeft > 0) --allocationsLeft;
  return ::operator new(size);
}
#endif

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

#ifndef ZK_ALLOCATIONS_CANNOT_FAIL
TEST(CritbitTreeTest, StaysAsItIsWhenMemoryIsOut) {
  const auto object = counted(1);
  for (const auto* present : {"", "key"}) {  // a root leaf; an inner node and its leaf
    for (int left = 0; left < (*present ? 2 : 1); ++left) {
      SCOPED_TRACE(testing::Message() << present << " and " << left << " allocations");
      CountedTree tree;
      if (*present) tree.setObject(counted(2), present);
      allocationsLeft = left;
      const bool stored = tree.setObject(object, "kez");
      allocationsLeft = -1;
      EXPECT_FALSE(stored);
      EXPECT_EQ(object->use_count(), 1u);
      EXPECT_EQ(tree.count(), *present ? 1u : 0u);
      EXPECT_EQ(tree.objectForKey("kez"), nullptr);
    }
  }
}
#endif

// The plain functions, without the wrapper: values are any pointers.
TEST(CritbitRecordTest, TellsWhatAnInsertionDid) {
  static std::vector<void*> released;
  released.clear();
  int values[2] = {};
  CritbitRecord tree{.releaseValue = [](void* value) { released.push_back(value); }};
  const auto stored = [&tree] {
    void* value = nullptr;
    critbit_contains(tree, "key", &value);
    return value;
  };
  EXPECT_EQ(critbit_insert(tree, "key", &values[0], false), CritbitInsertion::Inserted);
  EXPECT_EQ(critbit_insert(tree, "key", &values[0], true), CritbitInsertion::NothingDone);
  EXPECT_EQ(critbit_insert(tree, "key", &values[1], false), CritbitInsertion::KeyPresent);
  EXPECT_EQ(stored(), &values[0]);
  EXPECT_EQ(critbit_insert(tree, "key", &values[1], true), CritbitInsertion::KeyPresent);
  EXPECT_EQ(stored(), &values[1]);
  EXPECT_FALSE(critbit_delete(tree, "ke"));
  EXPECT_TRUE(critbit_delete(tree, "key"));
  EXPECT_EQ(tree.root, nullptr);
  EXPECT_EQ(released, (std::vector<void*>{&values[0], &values[1]}));
}

TEST(CritbitRecordTest, TheHandlerDecidesHowAWalkEnds) {
  CritbitRecord tree;
  int value = 0;
  for (const auto* key : {"a", "ab", "b"}) critbit_insert(tree, key, &value, true);
  struct Walk {
    int answer;  // from the second key on
    std::string keys;
  };
  const CritbitHandler handler = [](const char* key, void* argument) {
    auto& walk = *static_cast<Walk*>(argument);
    walk.keys += walk.keys.empty() ? key : std::string(" ") + key;
    return walk.keys == key ? 1 : walk.answer;
  };
  struct Case {
    std::string_view prefix;
    int answer;
    CritbitWalk expected;
    std::string keys;
  };
  const std::vector<Case> cases = {{"", 1, CritbitWalk::RanToTheEnd, "a ab b"},
                                   {"", 0, CritbitWalk::Stopped, "a ab"},
                                   {"a", 7, CritbitWalk::Failed, "a ab"},
                                   {"c", 0, CritbitWalk::RanToTheEnd, ""},
                                   {std::string_view(), 1, CritbitWalk::RanToTheEnd, ""}};
  for (const auto& wanted : cases) {
    SCOPED_TRACE(testing::Message() << "'" << wanted.prefix << "' " << wanted.answer);
    Walk walk{wanted.answer, ""};
    EXPECT_EQ(critbit_allprefixed(tree, wanted.prefix, handler, &walk), wanted.expected);
    EXPECT_EQ(walk.keys, wanted.keys);
  }
  critbit_clear(tree);
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
    ASSERT_EQ(tree.objectForKey(key), found == model.end() ? nullptr : found->second.get());
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
