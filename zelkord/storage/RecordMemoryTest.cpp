#include <gtest/gtest.h>
#include <malloc.h>

#include <algorithm>
#include <atomic>
#include <cstdlib>
#include <new>
#include <string>
#include <vector>

#include "halvane/FeedbackClasses.h"
#include "platform/testing/RecordingLog.h"
#include "zelkord/storage/SessionUnarchiver.h"
#include "zelkord/storage/StorageTestSupport.h"

// How much memory records take, for what clients can put into a message of so many bytes.

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define ZK_HEAP_IS_COUNTED 0
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define ZK_HEAP_IS_COUNTED 0
#endif
#endif
#ifndef ZK_HEAP_IS_COUNTED
#define ZK_HEAP_IS_COUNTED 1
#endif

// What is in use, with what the allocator rounds up. A sanitizer has an allocator of its own.
static std::atomic<std::uint64_t> heapInUse = 0;

#if ZK_HEAP_IS_COUNTED
void* operator new(std::size_t size) {
  void* const memory = std::malloc(size);
  if (!memory) throw std::bad_alloc();
  heapInUse += ::malloc_usable_size(memory) + sizeof(std::size_t);
  return memory;
}
void operator delete(void* memory) noexcept {
  if (memory) heapInUse -= ::malloc_usable_size(memory) + sizeof(std::size_t);
  std::free(memory);
}
void operator delete(void* memory, std::size_t) noexcept { operator delete(memory); }
#endif

namespace zelkord {
namespace {

constexpr double kMostBytesOfAByte = 20;
constexpr const char* kVersionOfWorst = "Zelkord/1.0 (test)";

std::string varint(std::size_t value) {
  std::string bytes;
  for (; value > 127; value >>= 7) bytes += static_cast<char>((value & 0x7F) | 0x80);
  return bytes + static_cast<char>(value);
}

std::string nested(int field, const std::string& content) {
  return varint(static_cast<std::size_t>(field) << 3 | 2) + varint(content.size()) + content;
}

std::string repeated(const std::string& item, std::size_t bytes) {
  std::string all;
  while (all.size() + item.size() <= bytes) all += item;
  return all;
}

// A stored record of that class, framed.
std::string storedRecord(std::string_view className, const std::string& message) {
  return framed(nested(1, nested(1, std::string(className)) + nested(2, message)));
}

// What a record may hold many of: each of its fields, empty or with values in each of their own.
std::vector<std::string> worstMessages(std::size_t bytes) {
  std::vector<std::string> messages = {""};
  for (int outer = 1; outer <= 8; ++outer) {
    messages.push_back(repeated(nested(outer, ""), bytes));
    for (int inner = 1; inner <= 16; ++inner) {
      for (const auto& item :
           {nested(inner, ""), varint(static_cast<std::size_t>(inner) << 3) + "\x01"}) {
        messages.push_back(repeated(nested(outer, item), bytes));
        messages.push_back(nested(outer, repeated(item, bytes)));
      }
    }
  }
  for (const auto& path : std::vector<std::vector<int>>{{3, 14, 3},
                                                        {3, 15, 2, 3},
                                                        {3, 4, 14, 3},
                                                        {3, 2, 2},
                                                        {3, 2, 3},
                                                        {3, 3, 4},
                                                        {3, 2, 2, 14, 3},
                                                        {4, 4, 14, 3},
                                                        {4, 14, 3},
                                                        {2, 4, 14, 3}}) {
    std::string message = repeated(nested(path.back(), ""), bytes);
    for (auto field = path.rbegin() + 1; field != path.rend(); ++field) {
      message = nested(*field, message);
    }
    messages.push_back(std::move(message));
  }
  for (const std::size_t size : {bytes / 4, bytes / 2, 3 * bytes / 4, bytes, 4 * bytes}) {
    std::string map;  // of keys that differ
    for (std::size_t key = 1; map.size() < size; ++key) {
      const auto rest = key > 127 ? varint(key >> 7) : "";
      map += nested(5, nested(1, varint(key & 0x7F) + rest));
    }
    messages.push_back(std::move(map));
  }
  return messages;
}

struct Cost {
  double ofAByte = 0;
  std::size_t records = 0;
};

Cost costOf(const std::string& records) {
  RecordingLog log;
  const Logger logger(log, "");
  auto container = framed(kVersionOfWorst) + framed(headerMessage()) + records;
  const auto size = container.size();
  SessionUnarchiver unarchiver(Data(std::move(container)), logger);
  const std::uint64_t before = heapInUse;
  const auto session = unarchiver.read(kVersionOfWorst);
  const std::uint64_t after = heapInUse;
  if (!session) return {};
  return {static_cast<double>(after - std::min(before, after)) / static_cast<double>(size),
          session->feedbacks.size()};
}

TEST(RecordMemoryTest, ARecordTakesAtMostTwentyTimesItsMessage) {
  if (!ZK_HEAP_IS_COUNTED) GTEST_SKIP() << "this build's allocator does not say what is in use";
  Cost worst;
  std::size_t taken = 0;
  const auto messages = worstMessages(800);
  for (const auto& known : feedbackClasses()) {
    for (std::size_t i = 0; i < messages.size(); ++i) {
      const auto cost = costOf(storedRecord(known.name, messages[i]));
      taken += cost.records;
      worst.ofAByte = std::max(worst.ofAByte, cost.ofAByte);
      EXPECT_LE(cost.ofAByte, kMostBytesOfAByte) << known.name << ", message " << i;
    }
  }
  EXPECT_GT(taken, 5000u);  // most messages are read, however odd
  RecordProperty("worst_bytes_of_a_byte", std::to_string(worst.ofAByte));
}

// Many small ones, and a single one as large as a message may be.
TEST(RecordMemoryTest, ASessionTakesAtMostTwentyTimesItsContainer) {
  if (!ZK_HEAP_IS_COUNTED) GTEST_SKIP() << "this build's allocator does not say what is in use";
  for (const auto& known : feedbackClasses()) {
    SCOPED_TRACE(known.name);
    const auto cost = costOf(repeated(storedRecord(known.name, ""), 200'000));
    EXPECT_LE(cost.ofAByte, kMostBytesOfAByte);
    EXPECT_GT(cost.records, 2000u);
  }
  const auto results = repeated(nested(3, ""), 128 * 1024);
  const auto large = costOf(storedRecord("HVVisibleResultsFeedback", results));
  EXPECT_EQ(large.records, 1u);
  EXPECT_LE(large.ofAByte, 4);
  auto header = testHeader();
  header.agent = std::string(60'000, 'x');
  RecordingLog log;
  const Logger logger(log, "");
  std::string message;
  appendRecord(header, message);
  auto container = framed(kVersionOfWorst) + framed(message) +
                   repeated(storedRecord("HVErrorFeedback", ""), 200'000);
  const auto size = container.size();
  SessionUnarchiver unarchiver(Data(std::move(container)), logger);
  const std::uint64_t before = heapInUse;
  const auto session = unarchiver.read(kVersionOfWorst);
  ASSERT_TRUE(session);
  EXPECT_LE(heapInUse - before, static_cast<std::uint64_t>(kMostBytesOfAByte) * size);
}

}  // namespace
}  // namespace zelkord
