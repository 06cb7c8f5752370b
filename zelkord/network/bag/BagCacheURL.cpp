#include "zelkord/network/bag/BagCacheURL.h"

#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/bag/BagFetchURL.h"
#include "zelkord/network/bag/BagRequests.h"

namespace zelkord {

std::shared_ptr<const std::string> BagCacheURL::get(const ZelkorBagController& controller,
                                                    const std::optional<std::string>& userAgent) {
  // Read before the URL is made: a change in between makes the next look miss.
  const Inputs inputs{requests_.contextGeneration(),
                      stringSetting(assembly_.userDefaults(), kBagURLSetting),
                      assembly_.useMorvane()};
  {
    const MutexLock lock(mutex_);
    if (url_ && inputs_ == inputs) return url_;
  }
  auto url = std::make_shared<const std::string>(
      requests_.bagCacheRequest(controller, userAgent, std::nullopt).url);
  const MutexLock lock(mutex_);
  inputs_ = inputs;
  url_ = url;
  return url;
}

}  // namespace zelkord
