#include "platform/linux/management/LinuxManagement.h"

#include <cerrno>

namespace zelkord {
namespace {

constexpr std::uint64_t kMaximumRestrictions = 1 << 20;

}  // namespace

LinuxManagement::LinuxManagement(const DeviceProfileStore& store, FileManager& files, LogSink& log)
    : store_(store),
      files_(files),
      log_(log, ""),
      path_(files.directories().state + "/restrictions.json") {}

RestrictionValue LinuxManagement::bookStoreAllowed() const {
  return store_.current()->bookStoreAllowed.value_or(RestrictionValue::Unset);
}

bool LinuxManagement::mediaStoreAllowed() const {
  return store_.current()->mediaStoreAllowed.value_or(true);
}

bool LinuxManagement::appInstallationAllowed() const {
  return store_.current()->appInstallationAllowed.value_or(true);
}

RestrictionValue LinuxManagement::diagnosticsSubmissionAllowed() const {
  return store_.current()->diagnosticsSubmissionAllowed.value_or(RestrictionValue::Unset);
}

json::object LinuxManagement::_readFile() {
  Error error;
  const auto text = files_.read(path_, kMaximumRestrictions, &error);
  if (!text && error.code == ENOENT) return {};
  std::string problem = text ? "not a JSON object" : error.reason().value_or("unreadable");
  auto value = text ? parseJson(*text, &problem) : std::nullopt;
  if (value && value->is_object()) return std::move(value->get_object());
  log_.error("{} is replaced: {}", path_, problem);
  return {};
}

std::optional<Error> LinuxManagement::setVisibilityRestrictions(const std::string& clientType,
                                                                const json::object& restrictions) {
  const MutexLock lock(mutex_);
  auto all = _readFile();
  if (const auto* present = objectIn(all, clientType); present && *present == restrictions) {
    return std::nullopt;
  }
  all.insert_or_assign(clientType, restrictions);
  return files_.writeAtomically(path_, json::serialize(all), 0600);
}

}  // namespace zelkord
