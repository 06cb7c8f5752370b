#include <gtest/gtest.h>

#include "platform/linux/url/InterfaceNames.h"

namespace zelkord {
namespace {

TEST(InterfaceNamesTest, NamesTheInterfaceAndNeverTheAddress) {
  InterfaceNames names;
  const struct {
    const char* address;
    const char* name;
  } cases[] = {{"127.0.0.1", "lo"}, {"192.0.2.1", ""}, {"2001:db8::1", ""}, {"eth0", ""}, {"", ""}};
  for (const auto& [address, name] : cases) {
    for (const Duration after : {0s, 2s, 120s}) {
      EXPECT_EQ(names.nameOf(address, SteadyTime(after)), name) << address;
    }
  }
}

}  // namespace
}  // namespace zelkord
