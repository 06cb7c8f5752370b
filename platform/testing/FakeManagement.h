#pragma once

#include <map>
#include <string>

#include "base/Mutex.h"
#include "platform/api/DeviceManagement.h"

namespace zelkord {

// Restrictions that a test sets, and those that were applied.
//
// Threading: `setVisibilityRestrictions`, `applied` and `applications` on any thread, the fields on
// the thread that drives the timeline.
class FakeManagement final : public DeviceManagement {
 public:
  RestrictionValue bookStore = RestrictionValue::Unset;
  bool mediaStore = true;
  bool appInstallation = true;
  RestrictionValue diagnosticsSubmission = RestrictionValue::Unset;
  // What applying then fails with.
  std::optional<Error> failure;

  RestrictionValue bookStoreAllowed() const override { return bookStore; }
  bool mediaStoreAllowed() const override { return mediaStore; }
  bool appInstallationAllowed() const override { return appInstallation; }
  RestrictionValue diagnosticsSubmissionAllowed() const override { return diagnosticsSubmission; }
  std::optional<Error> setVisibilityRestrictions(const std::string& clientType,
                                                 const json::object& restrictions) override {
    const MutexLock lock(mutex_);
    ++applications_;
    if (failure) return failure;
    applied_[clientType] = restrictions;
    return std::nullopt;
  }

  // By client type.
  std::map<std::string, json::object> applied() const {
    const MutexLock lock(mutex_);
    return applied_;
  }
  int applications() const {
    const MutexLock lock(mutex_);
    return applications_;
  }

 private:
  mutable Mutex mutex_;
  std::map<std::string, json::object> applied_ ZK_GUARDED_BY(mutex_);
  int applications_ ZK_GUARDED_BY(mutex_) = 0;
};

}  // namespace zelkord
