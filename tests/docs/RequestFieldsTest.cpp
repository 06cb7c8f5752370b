#include <gmock/gmock.h>

#include <fstream>
#include <regex>

#include "corezelkor/internal/RequestKinds.h"

namespace zelkord {
namespace {

// The text of a file of the repository, without its line breaks.
std::string textOf(const std::string& path) {
  std::ifstream file(ZK_SOURCE_DIR "/" + path);
  const std::string text{std::istreambuf_iterator<char>(file), {}};
  return std::regex_replace(text, std::regex("\n *"), " ");
}

// In the order of the alternatives of a field's place.
constexpr const char* kTypes[] = {"b", "u", "x", "t", "d", "s", "a(ss)"};

// The daemon and its library read and write by one table, and would agree on a wrong key too.
TEST(RequestFieldsTest, AreThoseThatAreWritten) {
  for (const auto* path : {"docs/ipc.md", "corezelkor/dbus/com.quenta.zelkord.xml"}) {
    const auto text = textOf(path);
    for (const auto* name : {"search", "moreResults", "card", "zeroKeyword", "lookup",
                             "flightLookup", "flightSearch"}) {
      const auto* kind = requestKindNamed(name);
      ASSERT_TRUE(kind) << name;
      for (const auto fields : {commonRequestFields(), kind->fields}) {
        for (const auto& [key, place] : fields) {
          const auto written = "\"" + std::string(key) + "\" " + kTypes[place.index()];
          EXPECT_THAT(text, testing::HasSubstr(written)) << path;
        }
      }
    }
  }
}

}  // namespace
}  // namespace zelkord
