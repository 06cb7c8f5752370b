#include <benchmark/benchmark.h>

#include <map>
#include <memory>
#include <string>

#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/linux/settings/LinuxSettings.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/TemporaryDirectory.h"

namespace zelkord {
namespace {

// Settings as a daemon has them: some thirty of its own, a few set by the user.
struct SettingsOnDisk {
  SettingsOnDisk() {
    json::object defaults;
    for (int i = 0; i < 30; ++i) defaults["ZLKRegisteredSetting" + std::to_string(i)] = i;
    settings.registerDefaults(defaults);
    for (int i = 0; i < 10; ++i) settings.set("ZLKSetting" + std::to_string(i), i);
    settings.set("ZLKBagURL", "https://suggest.example/bag");
    settings.flush();
  }

  TemporaryDirectory root;
  LinuxFileManager files{{root.path(), root.path(), root.path()}};
  LinuxClock clock;
  LinuxWorkQueues queues{clock, 2};
  RecordingLog log;
  LinuxSettings settings{
      {.databasePath = root / "defaults.db", .systemFolders = {}}, files, queues, log};
};

// The floor: a look into a map, without locks and layers.
void BM_SettingsFloor(benchmark::State& state) {
  std::map<std::string, json::value, std::less<>> map;
  for (int i = 0; i < 41; ++i) map["ZLKRegisteredSetting" + std::to_string(i)] = i;
  for (auto _ : state) {
    const std::string_view key = "ZLKRegisteredSetting29";
    benchmark::DoNotOptimize(map.find(key)->second.get_int64());
  }
}
BENCHMARK(BM_SettingsFloor);

void BM_SettingsRead(benchmark::State& state) {
  static const auto disk = std::make_unique<SettingsOnDisk>();
  static constexpr const char* kKeys[] = {"ZLKSetting5", "ZLKRegisteredSetting29", "ZLKBagURL",
                                          "ZLKMissing"};
  const auto* key = kKeys[state.range(0)];
  for (auto _ : state) benchmark::DoNotOptimize(disk->settings.value(key));
  state.SetLabel(key);
}
BENCHMARK(BM_SettingsRead)->DenseRange(0, 3);
BENCHMARK(BM_SettingsRead)->Arg(1)->Threads(2);

void BM_SettingsWrite(benchmark::State& state) {
  SettingsOnDisk disk;
  for (auto _ : state) disk.settings.set("ZLKSetting5", state.iterations());
}
BENCHMARK(BM_SettingsWrite);

}  // namespace
}  // namespace zelkord
