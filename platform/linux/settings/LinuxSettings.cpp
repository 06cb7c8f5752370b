#include "platform/linux/settings/LinuxSettings.h"

#include "platform/linux/settings/SettingsFiles.h"

namespace zelkord {

LinuxSettings::LinuxSettings(Options options, FileManager& files, WorkQueues& queues, LogSink& log)
    : queue_(queues.makeSerialQueue("com.quenta.zelkord.settings")),
      database_(std::move(options.databasePath), Logger(log, ""), options.busyTimeout) {
  SettingsLayers loaded;
  loaded.system = std::make_shared<const SettingsByDomain>(
      readSystemSettings(options.systemFolders, files, Logger(log, "")));
  queue_->sync([&] {
    queue_->assertCurrent();
    loaded.user = std::make_shared<const SettingsByDomain>(database_.load());
  });
  const MutexLock lock(mutex_);
  layers_ = std::move(loaded);
}

LinuxSettings::~LinuxSettings() { flush(); }

SettingsLayers LinuxSettings::_layers() const {
  const MutexLock lock(mutex_);
  return layers_;
}

std::optional<json::value> LinuxSettings::value(std::string_view key,
                                                std::string_view domain) const {
  const auto now = _layers();
  const auto* value = now.find(key, settingsDomain(domain));
  return value ? std::optional(*value) : std::nullopt;
}

json::object LinuxSettings::all(std::string_view domain) const {
  return _layers().all(settingsDomain(domain));
}

void LinuxSettings::set(std::string_view key, json::value value, std::string_view domain) {
  _change(key, domain, std::move(value));
}

void LinuxSettings::remove(std::string_view key, std::string_view domain) {
  _change(key, domain, std::nullopt);
}

void LinuxSettings::_change(std::string_view key, std::string_view domain,
                            std::optional<json::value> value) {
  domain = settingsDomain(domain);
  {
    const MutexLock lock(mutex_);
    auto user = std::make_shared<SettingsByDomain>(*layers_.user);
    auto& values = (*user)[std::string(domain)];
    auto& stored = pending_[{std::string(domain), std::string(key)}];
    if (value) {
      stored = json::serialize(*value);
      values.insert_or_assign(key, std::move(*value));
    } else {
      stored.reset();
      values.erase(key);
    }
    layers_.user = std::move(user);
  }
  queue_->async([this] { _persist(); });
  changes_.post(settingName(key, domain));
}

Subscription LinuxSettings::observe(std::string_view key, std::function<void()> changed,
                                    std::string_view domain) {
  return changes_.observe(settingName(key, domain),
                          [changed = std::move(changed)](const Notification&) { changed(); });
}

void LinuxSettings::registerDefaults(const json::object& values) {
  const MutexLock lock(mutex_);
  auto registered = std::make_shared<SettingsByDomain>(*layers_.registered);
  auto& own = (*registered)[std::string(kSettingsDomain)];
  for (const auto& [key, value] : values) own.insert_or_assign(key, value);
  layers_.registered = std::move(registered);
}

std::map<LinuxSettings::Place, std::optional<std::string>> LinuxSettings::_takePending() {
  const MutexLock lock(mutex_);
  return std::exchange(pending_, {});
}

void LinuxSettings::_persist() {
  queue_->assertCurrent();
  auto taken = _takePending();
  if (taken.empty()) return;
  std::vector<SettingsDatabase::Change> changes;
  for (const auto& [place, stored] : taken) changes.push_back({place.first, place.second, stored});
  if (database_.store(changes, [this] { return _everything(); })) return;
  const MutexLock lock(mutex_);
  pending_.merge(taken);  // what was set again meanwhile is newer and stays
}

std::vector<SettingsDatabase::Change> LinuxSettings::_everything() const {
  std::vector<SettingsDatabase::Change> all;
  const auto now = _layers();
  for (const auto& [domain, values] : *now.user) {
    for (const auto& [key, value] : values) all.push_back({domain, key, json::serialize(value)});
  }
  return all;
}

void LinuxSettings::flush() {
  queue_->sync([this] { _persist(); });
}

}  // namespace zelkord
