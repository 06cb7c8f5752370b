#pragma once

#include <map>
#include <string>

#include "base/Mutex.h"
#include "platform/api/NotificationCenter.h"
#include "platform/api/SettingsStore.h"

namespace zelkord {

// Settings in memory: registered defaults below what was set.
//
// Threading: any thread.
class FakeSettings final : public SettingsStore {
 public:
  std::optional<json::value> value(std::string_view key,
                                   std::string_view domain = {}) const override;
  void set(std::string_view key, json::value value, std::string_view domain = {}) override;
  void remove(std::string_view key, std::string_view domain = {}) override;
  void registerDefaults(const json::object& values) override;
  json::object all(std::string_view domain = {}) const override;
  void flush() override;
  Subscription observe(std::string_view key, std::function<void()> changed,
                       std::string_view domain = {}) override;

  // How often `flush` was called.
  int flushes() const;

 private:
  NotificationCenter changes_;
  mutable Mutex mutex_;
  json::object registered_ ZK_GUARDED_BY(mutex_);
  std::map<std::string, json::object, std::less<>> domains_ ZK_GUARDED_BY(mutex_);
  int flushes_ ZK_GUARDED_BY(mutex_) = 0;
};

}  // namespace zelkord
