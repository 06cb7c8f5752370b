#include <gtest/gtest.h>

#include <fstream>
#include <string>

#include "platform/linux/process/StartMemory.h"

namespace zelkord {
namespace {

// Resident pages of files, in KiB.
long residentFilePages() {
  std::ifstream status("/proc/self/status");
  for (std::string word; status >> word;) {
    long size = 0;
    if (word == "RssFile:" && status >> size) return size;
  }
  return 0;
}

std::string writtenBefore = "before";
const std::string* const kPointsAtIt = &writtenBefore;

TEST(StartMemoryTest, GivesPagesBackAndKeepsWhatWasWritten) {
  writtenBefore += " and after";
  const auto before = residentFilePages();
  releaseStartMemory();
  EXPECT_LT(residentFilePages(), before);
  EXPECT_EQ(*kPointsAtIt, "before and after");
  std::string text(1 << 20, 'x');
  EXPECT_EQ(text.find('y'), std::string::npos);
}

}  // namespace
}  // namespace zelkord
