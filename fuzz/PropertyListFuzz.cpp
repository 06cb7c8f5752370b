// Reads any bytes as a binary property list. What is read can be written, and reads the same again.

#include <cstdint>
#include <string_view>

#include "base/Check.h"
#include "platform/linux/property_list/BinaryPropertyLists.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  if (size > 65'536) return 0;
  const BinaryPropertyLists lists;
  Error error;
  const auto value = lists.decode({reinterpret_cast<const char*>(data), size}, &error);
  ZK_CHECK(value || error.reason(), "a value or why there is none");
  if (!value || !value->is_object()) return 0;
  const auto written = lists.encode(value->get_object(), &error);
  ZK_CHECK(written, "what was read can be written");
  ZK_CHECK(lists.decode(*written, nullptr) == value, "what was written reads the same");
  return 0;
}
