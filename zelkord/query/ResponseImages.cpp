#include "zelkord/query/ResponseImages.h"

#include <algorithm>

#include "zelkord/assembly/Assembly.h"

namespace zelkord {

ResponseImages::ResponseImages(Assembly& assembly)
    : imageHostsQueue_(
          assembly.platform().queues.makeConcurrentQueue("com.quenta.zelkord.imageHostsQueue")),
      validImageHosts_(std::make_shared<const ImageHosts>()) {}

void ResponseImages::processImagesFromResponse(const json::value& response, const ZLKBag* bag) {
  if (!bag) return;
  ImageHosts hosts;
  OrderedImages images;
  enumerateImagesInResponse(response, [&](const json::value& descriptor) {
    collectOrderedImages(ImageDescriptor::of(descriptor), *bag, &hosts, images);
  });
  _allow(std::move(hosts));
}

void ResponseImages::_allow(ImageHosts hosts) {
  if (hosts.empty()) return;
  imageHostsQueue_->barrierAsync([weak = weak_from_this(), hosts = std::move(hosts)] {
    if (const auto self = weak.lock()) self->_add(hosts);
  });
}

void ResponseImages::_add(const ImageHosts& hosts) {
  imageHostsQueue_->assertBarrier();
  if (std::ranges::includes(*validImageHosts_, hosts)) return;
  auto all = std::make_shared<ImageHosts>(*validImageHosts_);
  all->insert(hosts.begin(), hosts.end());
  validImageHosts_ = std::move(all);
}

}  // namespace zelkord
