#include <gtest/gtest.h>

#include <algorithm>
#include <string>

#include "platform/linux/url_cache/CacheIndex.h"
#include "platform/linux/url_cache/CachePolicyTestSupport.h"
#include "platform/linux/url_cache/CacheVary.h"
#include "platform/linux/url_cache/MemoryPart.h"
#include "platform/linux/url_cache/StoredHead.h"

namespace zelkord {
namespace {

using Ids = CacheIndex::Ids;

struct IndexBed {
  // Gives the ids that go.
  Ids add(const std::string& url, std::uint64_t cost, const std::string& language = {}) {
    CacheEntry entry{.url = cacheKeyOf(url), .cost = cost};
    if (!language.empty()) {
      entry.vary = "accept-language";
      entry.variant = variantOf(entry.vary, requestFor(url, language));
    }
    return index.add(entry);
  }
  std::int64_t find(const std::string& url, const std::string& language = {}) {
    const auto* entry = index.find(cacheKeyOf(url), requestFor(url, language));
    return entry ? entry->id : 0;
  }
  static URLRequest requestFor(const std::string& url, const std::string& language) {
    return {.url = url, .headers = {{"Accept-Language", language}}};
  }

  CacheIndex index{100};
};

TEST(CacheIndexTest, DropsWhatWasNotUsedForLongest) {
  IndexBed bed;
  EXPECT_EQ(bed.add("a", 40), Ids{});
  EXPECT_EQ(bed.add("b", 40), Ids{});
  EXPECT_EQ(bed.find("a"), 1);
  EXPECT_EQ(bed.add("c", 40), Ids{2});
  EXPECT_EQ(bed.find("b"), 0);
  EXPECT_EQ(bed.add("a", 50), Ids{1});
  EXPECT_EQ(bed.index.cost(), 90u);
  EXPECT_EQ(bed.index.takeUses(), (CacheIndex::Uses{{4, 5}, {3, 4}}));
  EXPECT_EQ(bed.index.takeUses(), CacheIndex::Uses{});
  // Numbers go on where they stopped.
  CacheIndex reloaded(100);
  EXPECT_EQ(reloaded.load({{.id = 7, .cost = 60, .used = 2}, {.id = 5, .cost = 60, .used = 3}}),
            Ids{7});
  CacheEntry next{.cost = 1};
  reloaded.add(next);
  EXPECT_EQ(next.id, 8);
  EXPECT_EQ(next.used, 4u);
}

TEST(CacheIndexTest, KeepsVariantsOfAURLApart) {
  IndexBed bed;
  bed.add("a", 1, "de");
  bed.add("a", 1, "en");
  EXPECT_EQ(bed.find("a", "de"), 1);
  EXPECT_EQ(bed.find("a", "en"), 2);
  EXPECT_EQ(bed.find("a", "fr"), 0);
  EXPECT_EQ(bed.add("a", 1, "de"), Ids{1});
  // Of two that fit, the newer one.
  bed.add("a", 1);
  EXPECT_EQ(bed.find("a", "de"), 4);
  for (int i = 0; i < 5; ++i) EXPECT_EQ(bed.add("a", 1, "l" + std::to_string(i)), Ids{});
  EXPECT_EQ(bed.add("a", 1, "more"), Ids{2});
  EXPECT_EQ(bed.index.removeURL(cacheKeyOf("a#top")).size(), CacheIndex::kMaximumVariants);
  EXPECT_TRUE(bed.index.empty());
  EXPECT_EQ(bed.index.cost(), 0u);
}

TEST(CacheIndexTest, BoundsTheNumberOfEntries) {
  IndexBed bed;
  for (std::size_t i = 0; i < CacheIndex::kMaximumCount; ++i) bed.add(std::to_string(i), 0);
  EXPECT_EQ(bed.add("one more", 0), Ids{1});
}

TEST(MemoryPartTest, HoldsWhatWasUsedLast) {
  const auto sized = [](std::size_t size) {
    return std::make_shared<const StoredResponse>(storedForTest({}, 200, std::string(size, 'x')));
  };
  MemoryPart memory(100);
  for (int id = 1; id <= 4; ++id) memory.put(id, sized(25));
  EXPECT_TRUE(memory.find(1));
  memory.put(5, sized(20));
  EXPECT_FALSE(memory.has(2));
  EXPECT_TRUE(memory.has(1));
  EXPECT_EQ(memory.cost(), 95u);
  memory.put(6, sized(26));
  EXPECT_FALSE(memory.has(6)) << "more than a quarter";
  memory.put(1, sized(26));
  EXPECT_FALSE(memory.has(1)) << "not the one before either";
  EXPECT_EQ(memory.cost(), 70u);
}

TEST(MemoryPartTest, CountsWhatManySmallHeadersTake) {
  MemoryPart memory(4 << 20);
  const auto many = storedForTest(HTTPHeaders(64 * 1024, {"a", ""}));
  memory.put(1, std::make_shared<const StoredResponse>(many));
  EXPECT_FALSE(memory.has(1)) << "4 MiB of strings";
}

TEST(StoredHeadTest, ReadsBackWhatItWrote) {
  auto stored = storedForTest({{"A", ""}, {"", std::string("\0\n\xFF", 3)}, {"A", "2"}}, 599, "");
  stored.requestedAt = WallTime(Duration(-5));
  const auto bytes = encodeStoredHead(stored);
  const auto read = decodeStoredHead(bytes);
  ASSERT_TRUE(read);
  EXPECT_EQ(read->response.headers, stored.response.headers);
  EXPECT_EQ(read->response.status, 599);
  EXPECT_EQ(read->requestedAt, stored.requestedAt);
  EXPECT_EQ(read->receivedAt, stored.receivedAt);
  for (std::size_t size = 0; size < bytes.size(); ++size) {
    EXPECT_FALSE(decodeStoredHead(std::string_view(bytes).substr(0, size))) << size;
  }
  EXPECT_FALSE(decodeStoredHead(bytes + "x"));
  for (const auto time : {Duration::min(), Duration::max()}) {
    stored.receivedAt = WallTime(time);
    EXPECT_FALSE(decodeStoredHead(encodeStoredHead(stored))) << "an age would overflow";
  }
}

}  // namespace
}  // namespace zelkord
