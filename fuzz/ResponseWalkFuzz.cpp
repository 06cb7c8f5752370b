// Reads any bytes as a response, and as the bag too, and looks for images in it.

#include <cstdint>
#include <string_view>

#include "base/Check.h"
#include "zelkord/network/exchange/URLHost.h"
#include "zelkord/query/ImageWalk.h"

namespace zelkord {
namespace {

void checkHosts(const ImageHosts& hosts) {
  for (const auto& host : hosts) {
    const auto place = URLHost::parse("https://" + host + "/");
    ZK_CHECK(place && place->host == host, "a host is in its one form");
  }
}

void checkURLs(const OrderedImages& images, const ImageHosts& hosts) {
  ZK_CHECK(images.primary.size() + images.secondary.size() == images.seen.size(),
           "a URL is listed once");
  for (const auto* list : {&images.primary, &images.secondary}) {
    for (const auto& url : *list) {
      const auto place = URLHost::parse(url);
      ZK_CHECK(place && hosts.contains(place->host), "a listed URL has a host that is noted");
      ZK_CHECK(images.seen.contains(url), "a listed URL is marked");
    }
  }
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace zelkord;
  const auto response = parseJson({reinterpret_cast<const char*>(data), size});
  if (!response) return 0;
  const auto* object = response->if_object();
  const ZLKBag bag(std::make_shared<const json::object>(object ? *object : json::object()), {});
  ImageHosts hosts;
  OrderedImages images;
  std::size_t identifiers = 0;
  enumerateImagesInResponse(*response, [&](const json::value& value) {
    const auto descriptor = ImageDescriptor::of(value);
    identifiers += descriptor.id && descriptor.data.empty() ? 1 : 0;
    collectOrderedImages(descriptor, bag, &hosts, images);
  });
  ZK_CHECK(collectResponseImageIdentifiers(*response).size() == identifiers,
           "every identifier without bytes is listed");
  checkHosts(hosts);
  checkURLs(images, hosts);
  return 0;
}
