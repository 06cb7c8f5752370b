#include <gmock/gmock.h>

#include <limits>

#include "platform/testing/RecordingLog.h"
#include "zelkord/storage/ArchivedDataIterator.h"
#include "zelkord/storage/StorageTestSupport.h"

namespace zelkord {
namespace {

using testing::ElementsAre;

constexpr std::uint64_t kLimit = 1000;

std::string lengthOf(std::uint64_t length) {
  return {reinterpret_cast<const char*>(&length), sizeof length};
}

TEST(EndOfWholeRecordsTest, IsWhereTheRecordBeganThatWasCutShort) {
  const auto first = framed("first"), second = framed("the second");
  const auto bytes = first + second;
  for (std::size_t size = 0; size <= bytes.size(); ++size) {
    SCOPED_TRACE(size);
    const bool whole = size == 0 || size == first.size() || size == bytes.size();
    const auto last = size < first.size() ? 0 : first.size();
    EXPECT_EQ(endOfWholeRecords(bytes.substr(0, size), kLimit),
              whole ? std::nullopt : std::optional<std::uint64_t>(last));
  }
}

TEST(EndOfWholeRecordsTest, IsNotAskedOfOtherDamage) {
  const auto first = framed("first");
  const struct {
    const char* name;
    std::string rest;
    std::optional<std::uint64_t> end;
  } cases[] = {{"zero length", lengthOf(0) + "abc", std::nullopt},
               {"length at the limit", lengthOf(kLimit) + "abc", std::nullopt},
               {"length below the limit", lengthOf(kLimit - 1) + "abc", first.size()},
               {"huge length", lengthOf(std::numeric_limits<std::uint64_t>::max()), std::nullopt},
               {"damage before a cut", lengthOf(0) + "abc" + lengthOf(7) + "cut", std::nullopt}};
  for (const auto& test : cases) {
    SCOPED_TRACE(test.name);
    EXPECT_EQ(endOfWholeRecords(first + test.rest, kLimit), test.end);
  }
}

TEST(ArchivedDataIteratorTest, StopsAtDamage) {
  const auto first = framed("first");
  const struct {
    std::string rest;
    bool hasMore;
    const char* text;
  } cases[] = {{"", false, "out of range"},
               {"1234567", false, "out of range"},
               {lengthOf(5), true, "out of range"},
               {lengthOf(0) + "x", true, "empty data file"},
               {lengthOf(2) + "x", true, "broken version string in file"},
               {lengthOf(std::numeric_limits<std::uint64_t>::max() - 3) + "x", true,
                "broken version string in file"}};
  for (const auto& test : cases) {
    SCOPED_TRACE(test.text);
    RecordingLog sink;
    const Logger log(sink, "test");
    ArchivedDataIterator records(Data(first + test.rest), log);
    EXPECT_EQ(records.readNextObject(), "first");
    EXPECT_EQ(records.hasMore(), test.hasMore);
    EXPECT_EQ(records.readNextObject(), std::nullopt);
    EXPECT_EQ(records.position(), first.size());
    EXPECT_THAT(sink.texts(), ElementsAre(test.text));
  }
}

}  // namespace
}  // namespace zelkord
