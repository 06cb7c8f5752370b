#include "zelkord/query/ResponseImages.h"

#include <algorithm>

#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/ImageFetcher.h"
#include "zelkord/network/URLHost.h"
#include "zelkord/network/ZelkorBagController.h"
#include "zelkord/query/ArrivedImages.h"
#include "zelkord/query/ImageWait.h"

namespace zelkord {
namespace {

// More than any service has; keeps one that invents hosts from filling the memory.
constexpr std::size_t kMaximumImageHosts = 100'000;

// The hosts that the bag itself names: of its resources the first one's, and the search service's.
ImageHosts hostsNamedBy(const ZLKBag& bag) {
  ImageHosts hosts;
  const auto add = [&hosts](std::string_view url) {
    auto place = URLHost::parse(url);
    if (place) hosts.insert(std::move(place->host));
    return place.has_value();
  };
  if (const auto* resources = bag.resources()) {
    for (const auto& entry : *resources) {
      const auto* url = entry.value().if_string();
      if (url && add(*url)) break;
    }
  }
  add(bag.searchURL().value_or(""));
  return hosts;
}

}  // namespace

ResponseImages::ResponseImages(Assembly& assembly)
    : assembly_(assembly),
      imageHostsQueue_(
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
  for (const auto& host : hosts) {
    if (all->size() < kMaximumImageHosts) all->insert(host);
  }
  validImageHosts_ = std::move(all);
}

void ResponseImages::loadImages(const std::vector<ImageDescriptor>& descriptors,
                                SteadyTime deadline,
                                const std::function<void(LoadedImages)>& completion,
                                std::shared_ptr<ImageWait> wait) {
  const auto bag = assembly_.bagController()->currentBag();
  if (!bag) return completion({});
  OrderedImages images;
  for (const auto& descriptor : descriptors) {
    collectOrderedImages(descriptor, *bag, nullptr, images);
  }
  if (!wait) wait = std::make_shared<ImageWait>(assembly_.platform().queues);
  const auto arrived = _fetch(images, *bag, wait);
  const auto now = assembly_.platform().clock.realNow();
  wait->wait(deadline > now ? deadline - now : Duration::zero());
  completion(_loaded(descriptors, *bag, *arrived));
}

ResponseImages::Hosts ResponseImages::_validHosts(const ZLKBag& bag) {
  Hosts hosts;
  imageHostsQueue_->sync([&] {
    imageHostsQueue_->assertReading();
    hosts = validImageHosts_;
  });
  if (!hosts->empty()) return hosts;
  auto seed = hostsNamedBy(bag);
  _allow(seed);
  return std::make_shared<const ImageHosts>(std::move(seed));
}

bool ResponseImages::_mayFetch(const std::string& url, const ImageHosts& hosts) const {
  const auto place = URLHost::parse(url);
  if (!place || !place->isHTTP()) {
    assembly_.log(Category::Images).error("loadImage with invalid scheme: {}", _shown(url));
    return false;
  }
  if (!hosts.contains(place->host)) {
    assembly_.log(Category::Images).error("loadImage with invalid host: {}", _shown(url));
    return false;
  }
  return true;
}

std::shared_ptr<ArrivedImages> ResponseImages::_fetch(const OrderedImages& images,
                                                      const ZLKBag& bag,
                                                      const std::shared_ptr<ImageWait>& wait) {
  const auto arrived = std::make_shared<ArrivedImages>();
  if (images.seen.empty()) return arrived;
  const auto hosts = _validHosts(bag);
  const auto acceptsRedirect = [hosts](const std::string& url) {
    const auto place = URLHost::parse(url);
    return place && place->isHTTP() && hosts->contains(place->host);
  };
  auto& queue = assembly_.platform().queues.global(QualityOfService::High);
  for (const auto* list : {&images.primary, &images.secondary}) {
    for (const auto& url : *list) {
      if (!_mayFetch(url, *hosts)) continue;
      const auto future = assembly_.imageFetcher()->fetchImageData(
          url, bag.timeoutIntervalForRequest(), acceptsRedirect);
      wait->enter();
      future.then([weak = std::weak_ptr(arrived), url, wait, &queue](const auto& image) {
        const auto wanted = weak.lock();
        if (wanted && image) wanted->add(url, *image);
        queue.async([wait] { wait->leave(); });
      });
    }
  }
  return arrived;
}

LoadedImages ResponseImages::_loaded(const std::vector<ImageDescriptor>& descriptors,
                                     const ZLKBag& bag, const ArrivedImages& arrived) const {
  const auto& log = assembly_.log(Category::Images);
  LoadedImages images;
  std::unordered_set<std::string_view> filed;
  const auto bytesAt = [&arrived](const std::optional<std::string>& url) {
    return url ? arrived.find(*url) : std::nullopt;
  };
  for (const auto& [url, id, data] : descriptors) {
    if (const auto bytes = bytesAt(url)) {
      log.debug("mapping image url {} to {} bytes of data", _shown(*url), bytes->size());
      if (filed.insert(*url).second) images.emplace_back(*url, *bytes);
    } else if (const auto named = id ? bytesAt(bag.urlForIdentifier(*id)) : std::nullopt) {
      log.debug("mapping image id {} to {} bytes of data", *id, named->size());
      if (filed.insert(*id).second) images.emplace_back(*id, *named);
    }
  }
  return images;
}

std::string ResponseImages::_shown(const std::string& url) const {
  return urlForLog(url, assembly_.platform().log.showsPrivateData());
}

}  // namespace zelkord
