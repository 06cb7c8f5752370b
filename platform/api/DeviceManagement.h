#pragma once

#include <optional>
#include <string>

#include "base/Error.h"
#include "base/Json.h"

namespace zelkord {

// Effective value of a three-way restriction.
enum class RestrictionValue { Unset = 0, Yes = 1, No = 2 };

// Device management. Changes: kEffectiveRestrictionsChanged.
// Answers from memory, on any thread; a change is announced in the notification centre.
class DeviceManagement {
 public:
  virtual ~DeviceManagement() = default;
  virtual RestrictionValue bookStoreAllowed() const = 0;
  virtual bool mediaStoreAllowed() const = 0;
  virtual bool appInstallationAllowed() const = 0;
  virtual RestrictionValue diagnosticsSubmissionAllowed() const = 0;
  // Stores `restrictions` (setting to value) as what `clientType` asks for, durable.
  virtual std::optional<Error> setVisibilityRestrictions(const std::string& clientType,
                                                         const json::object& restrictions) = 0;
};

}  // namespace zelkord
