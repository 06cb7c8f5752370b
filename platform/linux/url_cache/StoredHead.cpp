#include "platform/linux/url_cache/StoredHead.h"

#include <cstddef>
#include <cstdint>
#include <limits>

namespace zelkord {
namespace {

constexpr std::size_t kNumberSize = 8;

void appendNumber(std::string& bytes, std::uint64_t number) {
  for (std::size_t i = 0; i < kNumberSize; ++i) {
    bytes.push_back(static_cast<char>(number >> (8 * i) & 0xFF));
  }
}

void appendText(std::string& bytes, std::string_view text) {
  appendNumber(bytes, text.size());
  bytes += text;
}

std::uint64_t nanosecondsOf(WallTime time) {
  return static_cast<std::uint64_t>(time.time_since_epoch().count());
}
// From 1896 to 2116: far from the ends, times are subtracted.
bool isSaneTime(WallTime time) {
  const auto count = time.time_since_epoch().count();
  return count > -(std::int64_t{1} << 61) && count < std::int64_t{1} << 62;
}
WallTime timeOfNanoseconds(std::uint64_t count) {
  return WallTime(Duration(static_cast<std::int64_t>(count)));
}

// Takes values off the front; after the first that is not there, all are empty.
class HeadReader {
 public:
  explicit HeadReader(std::string_view bytes) : rest_(bytes) {}

  std::uint64_t number() {
    const auto bytes = _take(kNumberSize);
    std::uint64_t value = 0;
    for (std::size_t i = bytes.size(); i-- > 0;) {
      value = value << 8 | static_cast<unsigned char>(bytes[i]);
    }
    return value;
  }
  std::string_view text() { return _take(number()); }
  bool failed() const { return failed_; }
  bool isAtEnd() const { return !failed_ && rest_.empty(); }

 private:
  std::string_view _take(std::uint64_t size) {
    failed_ = failed_ || size > rest_.size();
    if (failed_) return {};
    const auto taken = rest_.substr(0, size);
    rest_.remove_prefix(size);
    return taken;
  }

  std::string_view rest_;
  bool failed_ = false;
};

}  // namespace

std::string encodeStoredHead(const StoredResponse& stored) {
  std::string bytes;
  appendNumber(bytes, static_cast<std::uint32_t>(stored.response.status.value_or(0)));
  appendNumber(bytes, nanosecondsOf(stored.requestedAt));
  appendNumber(bytes, nanosecondsOf(stored.receivedAt));
  appendNumber(bytes, stored.response.headers.size());
  for (const auto& [name, value] : stored.response.headers) {
    appendText(bytes, name);
    appendText(bytes, value);
  }
  return bytes;
}

std::optional<StoredResponse> decodeStoredHead(std::string_view bytes) {
  HeadReader reader(bytes);
  StoredResponse stored;
  const auto status = reader.number();
  if (status > std::numeric_limits<int>::max()) return std::nullopt;
  if (status != 0) stored.response.status = static_cast<int>(status);
  stored.requestedAt = timeOfNanoseconds(reader.number());
  stored.receivedAt = timeOfNanoseconds(reader.number());
  if (!isSaneTime(stored.requestedAt) || !isSaneTime(stored.receivedAt)) return std::nullopt;
  for (auto count = reader.number(); count > 0 && !reader.failed(); --count) {
    const auto name = reader.text();
    const auto value = reader.text();
    stored.response.headers.emplace_back(name, value);
  }
  if (!reader.isAtEnd()) return std::nullopt;
  return stored;
}

}  // namespace zelkord
