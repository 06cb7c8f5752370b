#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "base/Json.h"
#include "corezelkor/ZLKBag.h"
#include "platform/api/Budget.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/query/ImageCall.h"
#include "zelkord/query/ImageWalk.h"

namespace zelkord {

class Assembly;

// The images that responses describe: learns from the responses which hosts serve them, and loads
// images from those hosts only. As long as no host is known, the ones that the bag names count.
//
// Threading: any thread. Ownership: owned by the assembly.
class ResponseImages final : public std::enable_shared_from_this<ResponseImages> {
 public:
  explicit ResponseImages(Assembly& assembly);

  // Takes the hosts of a response's images as good from now on; at most 100,000 in all. Nothing
  // without a bag.
  void processImagesFromResponse(const json::value& response, const ZLKBag* bag);

  // Begins a call, which the caller then lets ask for its images; by its deadline `completion` has
  // what is there. Null when it is over: without a bag it has nothing at once.
  std::shared_ptr<ImageCall> loadImages(ImageOrder order, ImageCall::Completion completion);

 private:
  using Hosts = std::shared_ptr<const ImageHosts>;

  void _allow(ImageHosts hosts);
  void _add(const ImageHosts& hosts);
  Hosts _validHosts(const ZLKBag& bag);
  bool _mayFetch(const std::string& url, const ImageHosts& hosts) const;
  std::string _shown(const std::string& url) const;

  // Fixed after construction.
  Assembly& assembly_;
  const std::unique_ptr<ConcurrentQueue> imageHostsQueue_;

  // Own synchronisation. Bytes that calls hold until they are answered, by who asks.
  Budget imageBytes_;

  // Queue state: replaced in barrier tasks only.
  Hosts validImageHosts_ ZK_ON(imageHostsQueue_);
};

}  // namespace zelkord
