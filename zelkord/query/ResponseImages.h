#pragma once

#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "base/Json.h"
#include "base/Time.h"
#include "corezelkor/ZLKBag.h"
#include "platform/api/WorkQueues.h"
#include "zelkord/query/ImageWalk.h"

namespace zelkord {

class Assembly;

class ArrivedImages;
class ImageWait;

// Bytes by URL or identifier, each once, in the order in which they were asked for.
using LoadedImages = std::vector<std::pair<std::string, Data>>;

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

  // Calls back, on the caller's thread, with what is there at `deadline` (on the clock's real
  // time), blocking until then unless everything has come or failed before. What comes later is
  // in the URL cache for the next time. An image is filed under its identifier when only the
  // identifier's URL gave it. What comes after some 128 MiB is left out. Nothing without a bag. By
  // `wait`, when there is one, somebody else may give the wait up.
  void loadImages(const std::vector<ImageDescriptor>& descriptors, SteadyTime deadline,
                  const std::function<void(LoadedImages)>& completion,
                  std::shared_ptr<ImageWait> wait = nullptr);

 private:
  using Hosts = std::shared_ptr<const ImageHosts>;

  void _allow(ImageHosts hosts);
  void _add(const ImageHosts& hosts);
  Hosts _validHosts(const ZLKBag& bag);
  bool _mayFetch(const std::string& url, const ImageHosts& hosts) const;
  // Each image is waited for until it has come, or failed.
  std::shared_ptr<ArrivedImages> _fetch(const OrderedImages& images, const ZLKBag& bag,
                                        const std::shared_ptr<ImageWait>& wait);
  LoadedImages _loaded(const std::vector<ImageDescriptor>& descriptors, const ZLKBag& bag,
                       const ArrivedImages& arrived) const;
  std::string _shown(const std::string& url) const;

  // Fixed after construction.
  Assembly& assembly_;
  const std::unique_ptr<ConcurrentQueue> imageHostsQueue_;

  // Queue state: replaced in barrier tasks only.
  Hosts validImageHosts_ ZK_ON(imageHostsQueue_);
};

}  // namespace zelkord
