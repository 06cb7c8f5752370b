#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "base/Mutex.h"
#include "base/Namespace.h"

namespace zelkord {

class Assembly;
class BagRequests;
class ZelkorBagController;

// The URL that names a stored bag, remembered until something that goes into it changes: the
// request factory's context, "ZLKBagURL", "ZLKUseMorvane".
//
// Threading: any thread but the request factory's queue. Ownership: assembly and factory outlive
// it.
class BagCacheURL final {
 public:
  BagCacheURL(const Assembly& assembly, BagRequests& requests)
      : assembly_(assembly), requests_(requests) {}

  std::shared_ptr<const std::string> get(const ZelkorBagController& controller,
                                         const std::optional<std::string>& userAgent);

 private:
  struct Inputs {
    std::uint64_t contextGeneration = 0;
    std::string bagURLSetting;
    bool useMorvane = false;
    friend bool operator==(const Inputs&, const Inputs&) = default;
  };

  const Assembly& assembly_;
  BagRequests& requests_;
  Mutex mutex_;
  Inputs inputs_ ZK_GUARDED_BY(mutex_);
  std::shared_ptr<const std::string> url_ ZK_GUARDED_BY(mutex_);  // null: none yet
};

}  // namespace zelkord
