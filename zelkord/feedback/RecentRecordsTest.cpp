#include <gtest/gtest.h>

#include "halvane/DaemonFeedback.h"
#include "zelkord/feedback/RecentRecords.h"

namespace zelkord {
namespace {

ZelkorFeedback endWith(std::size_t bytes, std::int64_t queryId) {
  auto end = std::make_shared<ZLKEndNetworkSearchFeedback>();
  end->fbq = std::string(bytes, 'x');
  return {std::move(end), queryId, std::nullopt, std::nullopt, 0};
}

TEST(RecentRecordsTest, StaysSmallWhateverTheServiceSends) {
  constexpr std::size_t kMiB = 1000 * 1000;
  const struct {
    std::size_t bytes;
    std::size_t kept;
  } cases[] = {{0, 10}, {kMiB, 4}, {3 * kMiB, 1}, {8 * kMiB, 1}};
  for (const auto& [bytes, kept] : cases) {
    RecentRecords records(10);
    for (std::int64_t i = 0; i < 50; ++i) records.add(endWith(bytes, i));
    const auto all = records.all();
    EXPECT_EQ(all.size(), kept) << bytes;
    EXPECT_EQ(all.back().queryId, 49) << bytes;
    EXPECT_EQ(records.total(), 50u);
    records.clear();
    for (std::int64_t i = 0; i < 50; ++i) records.add(endWith(bytes, i));
    EXPECT_EQ(records.all().size(), kept) << "again after being cleared";
  }
}

}  // namespace
}  // namespace zelkord
