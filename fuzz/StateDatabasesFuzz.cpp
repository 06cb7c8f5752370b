// Any bytes as each of the SQLite files that the daemon keeps values in: the settings, the counters
// and the knowledge store. Whatever the file is, the daemon starts on it and goes on.

#include <cstdint>
#include <filesystem>
#include <string_view>

#include "base/Check.h"
#include "platform/linux/counters/LinuxCounters.h"
#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/knowledge/KnowledgeDatabase.h"
#include "platform/linux/settings/LinuxSettings.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

// Makes the file from nothing: what an earlier input left would decide over this one.
void place(const TemporaryDirectory& root, std::string_view bytes) {
  for (const auto& entry : std::filesystem::directory_iterator(root.path())) {
    std::filesystem::remove_all(entry);
  }
  root.write("defaults.db", bytes);
  root.write("counters.db", bytes);
  root.write("knowledge.db", bytes);
}

void readAsSettings(const TemporaryDirectory& root, FileManager& files, WorkQueues& queues) {
  RecordingLog log;
  const LinuxSettings::Options options{root / "defaults.db", {}, 1ms};
  bool isKept = false;
  {
    LinuxSettings settings(options, files, queues, log);
    const auto before = log.entries().size();
    settings.set("key", "value");
    settings.flush();
    ZK_CHECK(settings.value("key") == json::value("value"), "memory keeps it");
    isKept = log.entries().size() == before;
  }
  if (!isKept) return;
  const LinuxSettings again(options, files, queues, log);
  const bool reads = log.count("damaged") == 0 && log.count("cannot read") == 0;
  ZK_CHECK(!reads || again.value("key") == json::value("value"), "what was kept is found");
}

void readAsCounters(FileManager& files, WorkQueues& queues) {
  RecordingLog log;
  LinuxCounters counters(files, queues, log);
  const auto all = counters.all();
  const auto found = all.find("a");
  const auto before = found == all.end() ? 0 : found->second;
  counters.add("a", 1);
  ZK_CHECK(counters.all().at("a") - 1 == before || before == INT64_MAX, "it counts");
  counters.save();
}

void readAsKnowledge(const TemporaryDirectory& root) {
  constexpr WallTime kNow{std::chrono::seconds(1'795'348'800)};
  const KnowledgeDatabase database(root / "knowledge.db");
  (void)database.add({{"Brelin", "engaged", "{}", kNow}}, kNow);
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  if (size > 65'536) return 0;
  static const TemporaryDirectory root;
  LinuxFileManager files({root.path(), root.path(), root.path()});
  ManualTimeline timeline;
  place(root, {reinterpret_cast<const char*>(data), size});
  readAsSettings(root, files, timeline);
  readAsCounters(files, timeline);
  readAsKnowledge(root);
  return 0;
}
