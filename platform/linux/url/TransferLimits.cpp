#include "platform/linux/url/TransferLimits.h"

#include <sys/resource.h>

#include <algorithm>

namespace zelkord {
namespace {

constexpr std::uint64_t kLeastTransfers = 16;
constexpr std::uint64_t kMostTransfers = 1024;
// Four times what it takes at worst: the doors have half of the descriptors, and files a part.
constexpr std::uint64_t kDescriptorsPerTransfer = 16;
constexpr std::uint64_t kMostWaiting = 16'384;
constexpr std::uint64_t kLeastIdle = 8;
constexpr std::uint64_t kMostIdle = 32;
constexpr std::uint64_t kDescriptorsPerIdle = 32;

}  // namespace

TransferLimits TransferLimits::of(std::uint64_t descriptors) {
  const auto transfers =
      std::clamp(descriptors / kDescriptorsPerTransfer, kLeastTransfers, kMostTransfers);
  TransferLimits limits;
  limits.transfers = Budget::quartered(transfers);
  limits.patientTransfers = Budget::quartered(transfers / 4 * 3);
  limits.waiting = Budget::quartered(kMostWaiting);
  limits.idleConnections =
      static_cast<long>(std::clamp(descriptors / kDescriptorsPerIdle, kLeastIdle, kMostIdle));
  return limits;
}

TransferLimits TransferLimits::ofProcess() {
  rlimit limit{};
  const bool known = ::getrlimit(RLIMIT_NOFILE, &limit) == 0;
  return of(known ? limit.rlim_cur : 0);
}

}  // namespace zelkord
