// Any bytes as each of the JSON files that the daemon reads: the system's settings, which count
// when they are one object, and the visibility restrictions, which are then replaced.

#include <cstdint>
#include <string_view>

#include "base/Check.h"
#include "platform/linux/device/OsRelease.h"
#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/management/LinuxManagement.h"
#include "platform/linux/settings/LinuxSettings.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

void readAsSettings(const TemporaryDirectory& root, FileManager& files,
                    const std::optional<json::value>& parsed, std::string_view bytes) {
  ManualTimeline timeline;
  RecordingLog log;
  root.write("system/defaults.json", bytes);
  const LinuxSettings settings({root / "none/defaults.db", {root / "system"}, 1ms}, files, timeline,
                               log);
  const auto* object = parsed ? parsed->if_object() : nullptr;
  ZK_CHECK(settings.all() == (object ? *object : json::object()), "one object or nothing");
}

void readAsRestrictions(const TemporaryDirectory& root, FileManager& files,
                        const std::optional<json::value>& parsed, std::string_view bytes) {
  RecordingLog log;
  NotificationCenter center;
  const DeviceProfileStore profile(center, "en_US");
  root.write("restrictions.json", bytes);
  LinuxManagement management(profile, files, log);
  const json::object added{{"allow_news_results", false}};
  ZK_CHECK(!management.setVisibilityRestrictions("com.quenta.news", added), "it can be written");
  auto expected = parsed && parsed->is_object() ? parsed->get_object() : json::object();
  expected.insert_or_assign("com.quenta.news", added);
  ZK_CHECK(parseJson(root.read("restrictions.json")) == json::value(expected), "the others stay");
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  static const TemporaryDirectory root;
  static LinuxFileManager files({root.path(), root.path(), root.path()});
  const std::string_view bytes(reinterpret_cast<const char*>(data), size);
  const auto parsed = parseJson(bytes);
  readAsSettings(root, files, parsed, bytes);
  readAsRestrictions(root, files, parsed, bytes);
  for (const auto& [name, value] : parseOsRelease(bytes)) {
    ZK_CHECK(!name.empty() && bytes.find(name) != std::string_view::npos, "a name from the text");
  }
  return 0;
}
