#include "platform/testing/FakeSettings.h"

namespace zelkord {
namespace {

std::string_view settingsDomainOrOwn(std::string_view domain) {
  return domain.empty() ? kSettingsDomain : domain;
}

}  // namespace

std::optional<json::value> FakeSettings::value(std::string_view key,
                                               std::string_view domain) const {
  domain = settingsDomainOrOwn(domain);
  const MutexLock lock(mutex_);
  if (const auto found = domains_.find(domain); found != domains_.end()) {
    if (const auto* value = found->second.if_contains(key)) return *value;
  }
  const auto* value = domain == kSettingsDomain ? registered_.if_contains(key) : nullptr;
  return value ? std::optional(*value) : std::nullopt;
}

void FakeSettings::set(std::string_view key, json::value value, std::string_view domain) {
  {
    const MutexLock lock(mutex_);
    domains_[std::string(settingsDomainOrOwn(domain))].insert_or_assign(key, std::move(value));
  }
  changes_.post(settingName(key, domain));
}

void FakeSettings::remove(std::string_view key, std::string_view domain) {
  {
    const MutexLock lock(mutex_);
    const auto found = domains_.find(settingsDomainOrOwn(domain));
    if (found != domains_.end()) found->second.erase(key);
  }
  changes_.post(settingName(key, domain));
}

Subscription FakeSettings::observe(std::string_view key, std::function<void()> changed,
                                   std::string_view domain) {
  return changes_.observe(settingName(key, domain),
                          [changed = std::move(changed)](const Notification&) { changed(); });
}

void FakeSettings::registerDefaults(const json::object& values) {
  const MutexLock lock(mutex_);
  for (const auto& [key, value] : values) registered_.insert_or_assign(key, value);
}

json::object FakeSettings::all(std::string_view domain) const {
  domain = settingsDomainOrOwn(domain);
  const MutexLock lock(mutex_);
  json::object merged = domain == kSettingsDomain ? registered_ : json::object();
  const auto found = domains_.find(domain);
  if (found == domains_.end()) return merged;
  for (const auto& [key, value] : found->second) merged.insert_or_assign(key, value);
  return merged;
}

void FakeSettings::flush() {
  const MutexLock lock(mutex_);
  ++flushes_;
}

int FakeSettings::flushes() const {
  const MutexLock lock(mutex_);
  return flushes_;
}

}  // namespace zelkord
