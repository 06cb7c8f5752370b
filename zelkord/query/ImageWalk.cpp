#include "zelkord/query/ImageWalk.h"

#include "zelkord/network/exchange/URLHost.h"

namespace zelkord {
namespace {

// A walk over one response; `depth` is how many levels may still follow.
struct ImageWalk {
  FunctionRef<void(const json::value&)> callback;
  const ImageKeys& keys;

  void visit(const json::value& value, std::size_t depth) const {
    if (depth == 0) return;
    if (const auto* object = value.if_object()) {
      for (const auto& member : *object) visitMember(member, depth);
    } else if (const auto* array = value.if_array()) {
      for (const auto& element : *array) visit(element, depth - 1);
    }
  }

  void visitMember(const json::key_value_pair& member, std::size_t depth) const {
    if (!keys.contains(member.key())) {
      visit(member.value(), depth - 1);
    } else if (member.value().is_object()) {
      callback(member.value());
    } else if (const auto* array = member.value().if_array()) {
      for (const auto& element : *array) callback(element);
    }
  }
};

enum class Listed { No, New, Again };

// Appends `url` unless it was seen before.
Listed listImage(const std::string& url, ImageHosts* hosts, std::unordered_set<std::string>& seen,
                 std::vector<std::string>& list) {
  auto place = URLHost::parse(url);
  if (!place) return Listed::No;
  if (hosts) hosts->insert(std::move(place->host));
  if (!seen.insert(url).second) return Listed::Again;
  list.push_back(url);
  return Listed::New;
}

}  // namespace

ImageDescriptor ImageDescriptor::of(const json::value& value) {
  const auto* object = value.if_object();
  if (!object) return {};
  ImageDescriptor descriptor{stringIn(*object, "url"), stringIn(*object, "id"), {}};
  if (auto data = stringIn(*object, "data")) descriptor.data = Data(*std::move(data));
  return descriptor;
}

const ImageKeys& imageKeys() {
  static const ImageKeys keys = {
      "thumbnail",    "image",           "image_overlay",     "value_image", "secondary_image",
      "icon",         "completion_icon", "more_icons",        "base_icon",   "glyph",
      "rt_glyph",     "title_glyph",     "attribution_glyph", "more_glyphs", "more_glyphs1",
      "more_glyphs2", "play_button",     "posters",           "badge_image"};
  return keys;
}

void enumerateImagesInResponse(const json::value& response,
                               FunctionRef<void(const json::value&)> callback,
                               const ImageKeys* keys) {
  // The innermost of kMaximumJsonDepth containers may hold values still.
  ImageWalk{callback, keys ? *keys : imageKeys()}.visit(response, kMaximumJsonDepth + 1);
}

std::vector<ImageDescriptor> collectResponseImageIdentifiers(const json::value& response) {
  std::vector<ImageDescriptor> found;
  enumerateImagesInResponse(response, [&found](const json::value& value) {
    auto descriptor = ImageDescriptor::of(value);
    if (descriptor.id && descriptor.data.empty()) found.push_back(std::move(descriptor));
  });
  return found;
}

void collectOrderedImages(const ImageDescriptor& descriptor, const ZLKBag& bag, ImageHosts* hosts,
                          OrderedImages& images) {
  const auto& url = descriptor.url;
  if (url && listImage(*url, hosts, images.seen, images.primary) == Listed::Again) return;
  if (!descriptor.id) return;
  const auto named = bag.urlForIdentifier(*descriptor.id);
  if (named) listImage(*named, hosts, images.seen, url ? images.secondary : images.primary);
}

}  // namespace zelkord
