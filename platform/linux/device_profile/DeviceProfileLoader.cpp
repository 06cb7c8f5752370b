#include "platform/linux/device_profile/DeviceProfileLoader.h"

#include <cerrno>

namespace zelkord {
namespace {

constexpr std::uint64_t kMaximumProfile = 1 << 20;
constexpr Duration kProfileSettleTime = 100ms;
// Beyond this many different complaints somebody is playing with us.
constexpr std::size_t kMaximumComplaints = 1000;

}  // namespace

DeviceProfileLoader::DeviceProfileLoader(std::vector<std::string> candidates,
                                         DeviceProfileStore& store, FileManager& files,
                                         WorkQueues& queues, PathWatcher* watcher, LogSink& log)
    : candidates_(std::move(candidates)),
      store_(store),
      files_(files),
      log_(log, ""),
      queue_(queues.makeSerialQueue("com.quenta.zelkord.deviceprofile")) {
  // Watched first: a change while the file is read is then seen.
  for (const auto& path : candidates_) {
    if (watcher) watches_.push_back(watcher->watch(path, [this] { noteChange(); }));
  }
  queue_->sync([this] { _reload(); });
}

DeviceProfileLoader::~DeviceProfileLoader() {
  watches_.clear();
  queue_->sync([this] {
    queue_->assertCurrent();
    timer_.reset();
  });
}

void DeviceProfileLoader::noteChange() {
  queue_->async([this] { _arm(); });
}

void DeviceProfileLoader::_arm() {
  queue_->assertCurrent();
  if (timer_) return;
  timer_ = queue_->after(
      kProfileSettleTime, [this] { _reload(); }, TimeBase::Real);
}

void DeviceProfileLoader::_reload() {
  queue_->assertCurrent();
  timer_.reset();
  store_.replace(_read());
}

DeviceProfile DeviceProfileLoader::_read() {
  for (const auto& path : candidates_) {
    Error error;
    const auto text = files_.read(path, kMaximumProfile, &error);
    if (!text && error.code == ENOENT) continue;
    std::vector<std::string> problems;
    DeviceProfile profile;
    if (text) {
      profile = parseDeviceProfile(*text, problems);
    } else {
      problems.push_back("not usable: " + error.reason().value_or("unreadable"));
    }
    _complain(path, problems);
    return profile;
  }
  return {};
}

void DeviceProfileLoader::_complain(const std::string& path,
                                    const std::vector<std::string>& problems) {
  queue_->assertCurrent();
  for (const auto& problem : problems) {
    if (complaints_.size() >= kMaximumComplaints) return;
    auto text = "device profile " + path + ": " + problem;
    if (complaints_.insert(text).second) log_.error("{}", text);
  }
}

}  // namespace zelkord
