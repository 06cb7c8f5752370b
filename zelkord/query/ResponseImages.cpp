#include "zelkord/query/ResponseImages.h"

#include <algorithm>

#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/bag/ZelkorBagController.h"
#include "zelkord/network/exchange/URLHost.h"

namespace zelkord {
namespace {

// More than any service has; keeps one that invents hosts from filling the memory.
constexpr std::size_t kMaximumImageHosts = 100'000;

// Of all calls; a quarter is as much as one answer holds.
constexpr std::uint64_t kMostImageBytes = 256u << 20;

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
      imageBytes_("image_bytes", Budget::quartered(kMostImageBytes), assembly.limits()),
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

std::shared_ptr<ImageCall> ResponseImages::loadImages(ImageOrder order,
                                                      ImageCall::Completion completion) {
  auto bag = assembly_.bagController()->currentBag();
  if (!bag) {
    completion({});
    return nullptr;
  }
  OrderedImages images;
  for (const auto& descriptor : order.descriptors) {
    collectOrderedImages(descriptor, *bag, nullptr, images);
  }
  const auto hosts = images.seen.empty() ? nullptr : _validHosts(*bag);
  std::vector<std::string> urls;
  for (auto* list : {&images.primary, &images.secondary}) {
    for (auto& url : *list) {
      if (_mayFetch(url, *hosts)) urls.push_back(std::move(url));
    }
  }
  auto call = ImageCall::make(assembly_, std::move(order), std::move(bag), imageBytes_,
                              std::move(completion));
  call->setImages(std::move(urls), [hosts](const std::string& url) {
    const auto place = URLHost::parse(url);
    return place && place->isHTTP() && hosts->contains(place->host);
  });
  return call;
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

std::string ResponseImages::_shown(const std::string& url) const {
  return urlForLog(url, assembly_.platform().log.showsPrivateData());
}

}  // namespace zelkord
