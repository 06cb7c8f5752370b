#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "platform/api/URLRequest.h"

namespace zelkord {

class ZelkorBagController;

// The requests about the bag, made by the request factory, which asks the controller for the URL of
// the device's country (`bagFetchURLWithCountry`).
//
// Threading: any thread but a task of the factory's own queue; they wait for one short task there.
class BagRequests {
 public:
  virtual ~BagRequests() = default;
  // What downloads the bag; `version` is the one that the service says it has.
  virtual URLRequest bagFetchRequest(const ZelkorBagController& controller,
                                     const std::optional<std::string>& userAgent,
                                     const std::optional<std::string>& version) = 0;
  // Never sent: its URL is the identity of a stored bag.
  virtual URLRequest bagCacheRequest(const ZelkorBagController& controller,
                                     const std::optional<std::string>& userAgent,
                                     const std::optional<std::string>& version) = 0;
  // Grows before a `bagCacheRequest` can get another URL because the factory's context changed,
  // debug items included; the settings "ZLKBagURL" and "ZLKUseMorvane" are not part of it. One
  // atomic read.
  virtual std::uint64_t contextGeneration() const = 0;
};

}  // namespace zelkord
