#pragma once

#include <memory>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "corezelkor/ZLKBag.h"

namespace zelkord {

class Assembly;

// One client type and the settings that the bag asks device management to hold it to.
struct VisibilityRestriction {
  std::string clientType;  // a bundle identifier
  json::object settings;
};

// What a bag asks for: news results in system search, and the extension for hashtag images.
std::vector<VisibilityRestriction> visibilityRestrictionsOf(const ZLKBag& bag);

// Applies the restrictions of the latest bag.
//
// Threading: any thread; the work is done on a background queue, one bag at a time, so that an old
// bag never has the last word.
// Ownership: the assembly outlives it.
// Errors: logged; the next bag tries again.
class VisibilityRestrictions final : public std::enable_shared_from_this<VisibilityRestrictions> {
 public:
  explicit VisibilityRestrictions(Assembly& assembly) : assembly_(assembly) {}

  void update(std::shared_ptr<const ZLKBag> bag);

 private:
  void _applyLatest();
  void _apply(const VisibilityRestriction& restriction);

  // Fixed after construction.
  Assembly& assembly_;

  // Own synchronisation. `applying_` is taken before `mutex_`.
  Mutex applying_;
  Mutex mutex_;
  std::shared_ptr<const ZLKBag> latest_ ZK_GUARDED_BY(mutex_);
};

}  // namespace zelkord
