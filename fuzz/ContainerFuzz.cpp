// Any bytes as a container that a process left: cut back at the start, then read. What is cut never
// holds a whole record, and nothing that the reader could have given is lost.

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "base/Check.h"
#include "platform/api/Log.h"
#include "zelkord/storage/ContainerFormat.h"
#include "zelkord/storage/SessionUnarchiver.h"

namespace zelkord {
namespace {

constexpr std::uint64_t kLimit = 4096;
constexpr std::string_view kVersion = "Zelkord/1.0";

class NoLog final : public LogSink {
 public:
  bool isEnabled(LogLevel) const override { return false; }
  bool showsPrivateData() const override { return false; }
  void write(LogLevel, std::string_view, std::string_view) override {}
};

// The payloads up to the end or the first damage, found without the iterator.
std::vector<std::string_view> wholeRecords(std::string_view bytes) {
  std::vector<std::string_view> records;
  while (bytes.size() > kLengthSize) {
    std::uint64_t length = 0;
    for (std::size_t i = kLengthSize; i-- > 0;) {
      length = length << 8 | static_cast<std::uint8_t>(bytes[i]);
    }
    if (length == 0 || length > bytes.size() - kLengthSize) break;
    records.push_back(bytes.substr(kLengthSize, length));
    bytes.remove_prefix(kLengthSize + length);
  }
  return records;
}

void checkContainer(std::string_view bytes) {
  NoLog sink;
  const Logger log(sink, "fuzz");
  const auto expected = wholeRecords(bytes);
  const auto end = endOfWholeRecords(bytes, kLimit);
  ZK_CHECK(!end || *end < bytes.size(), "something is cut off");
  const auto kept = bytes.substr(0, end.value_or(bytes.size()));

  ArchivedDataIterator records(Data(std::string(kept)), log);
  std::size_t read = 0;
  while (const auto payload = records.readNextObject()) {
    ZK_CHECK(read < expected.size() && *payload == expected[read], "records stay as they were");
    ++read;
  }
  ZK_CHECK(read == expected.size(), "no whole record before the damage is lost");
  ZK_CHECK(!end || records.position() == kept.size(), "what was cut back ends with a record");

  const auto session = SessionUnarchiver(Data(std::string(kept)), log).read(kVersion);
  ZK_CHECK(!session || session->feedbacks.size() + 2 <= expected.size(), "nothing is made up");
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  zelkord::checkContainer({reinterpret_cast<const char*>(data), size});
  return 0;
}
