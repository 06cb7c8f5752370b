// Reads any bytes as the index file of the URL cache, and as what is written of a response in it.

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "base/Check.h"
#include "platform/linux/url_cache/DiskPart.h"
#include "platform/linux/url_cache/StoredHead.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

void readAsHead(std::string_view bytes) {
  const auto stored = decodeStoredHead(bytes);
  if (!stored) return;
  // A status with more than 32 bits is refused, so every head that is read has one form.
  ZK_CHECK(encodeStoredHead(*stored) == bytes, "what is read is what is written");
}

// Whatever the file is, what the cache is given afterwards is kept.
void readAsIndex(const TemporaryDirectory& state, std::string_view bytes) {
  RecordingLog log;
  for (const char* side : {"-wal", "-shm"}) std::filesystem::remove(state / "index.db" + side);
  state.write("index.db", bytes);
  DiskPart disk(state.path(), 4096, Logger(log, ""));
  for (const auto& entry : disk.load()) {
    ZK_CHECK(entry.id > 0, "ids are positive");
    disk.read(entry);
  }
  CacheRecord record{{.id = std::int64_t{1} << 62, .url = cacheKeyOf("http://host/"), .cost = 4},
                     std::make_shared<const StoredResponse>(StoredResponse{.body = Data("body")})};
  const auto outcome = disk.write({.added = {record}});
  if (disk.resets() > 0) return;  // a file that broke only now; the next one begins empty
  const auto read = outcome.notAdded.empty() ? disk.read(record.entry) : nullptr;
  ZK_CHECK(!read || read->body.view() == "body", "what was kept is found");
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  static const TemporaryDirectory state;
  const std::string_view bytes(reinterpret_cast<const char*>(data), size);
  readAsHead(bytes);
  readAsIndex(state, bytes);
  return 0;
}
