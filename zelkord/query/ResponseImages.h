#pragma once

#include <memory>

#include "base/Json.h"
#include "corezelkor/ZLKBag.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/query/ImageWalk.h"

namespace zelkord {

class Assembly;

// The images that responses describe: learns from the responses which hosts serve them.
//
// Threading: any thread. Ownership: owned by the assembly.
class ResponseImages final : public std::enable_shared_from_this<ResponseImages> {
 public:
  explicit ResponseImages(Assembly& assembly);

  // Takes the hosts of a response's images as good from now on. Nothing without a bag.
  void processImagesFromResponse(const json::value& response, const ZLKBag* bag);

 private:
  void _allow(ImageHosts hosts);
  void _add(const ImageHosts& hosts);

  // Fixed after construction.
  const std::unique_ptr<ConcurrentQueue> imageHostsQueue_;

  // Queue state: replaced in barrier tasks only.
  std::shared_ptr<const ImageHosts> validImageHosts_ ZK_ON(imageHostsQueue_);
};

}  // namespace zelkord
