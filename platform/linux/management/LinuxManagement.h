#pragma once

#include "base/Mutex.h"
#include "platform/api/DeviceManagement.h"
#include "platform/api/FileManager.h"
#include "platform/api/Log.h"
#include "platform/linux/device_profile/DeviceProfileStore.h"

namespace zelkord {

// Device management: the restrictions of the device profile, and the visibility restrictions in
// "restrictions.json" of the state directory, an object from client type to {setting: value}, which
// search surfaces read.
//
// Threading: any thread; `setVisibilityRestrictions` blocks for the disk.
// Ownership: everything given outlives it.
// Errors: a file that cannot be used is logged and replaced.
class LinuxManagement final : public DeviceManagement {
 public:
  LinuxManagement(const DeviceProfileStore& store, FileManager& files, LogSink& log);

  RestrictionValue bookStoreAllowed() const override;
  bool mediaStoreAllowed() const override;
  bool appInstallationAllowed() const override;
  RestrictionValue diagnosticsSubmissionAllowed() const override;
  // Writes nothing when the file says it already.
  std::optional<Error> setVisibilityRestrictions(const std::string& clientType,
                                                 const json::object& restrictions) override;

 private:
  json::object _readFile();

  const DeviceProfileStore& store_;
  FileManager& files_;
  const Logger log_;
  const std::string path_;
  Mutex mutex_;  // one change of the file at a time
};

}  // namespace zelkord
