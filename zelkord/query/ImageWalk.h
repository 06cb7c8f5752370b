#pragma once

#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <unordered_set>
#include <vector>

#include "base/Data.h"
#include "base/FunctionRef.h"
#include "base/Json.h"
#include "corezelkor/ZLKBag.h"

namespace zelkord {

// Finds the images that a response of the service describes. Functions without state; any thread.

// One image: by its absolute URL, by an identifier that the bag maps to a URL, or itself.
struct ImageDescriptor {
  std::optional<std::string> url;
  std::optional<std::string> id;
  Data data;

  // A member of the wrong type counts as absent, and of what is no object all are.
  static ImageDescriptor of(const json::value& value);
};

using ImageKeys = std::unordered_set<std::string_view>;
using ImageHosts = std::set<std::string, std::less<>>;

// The keys whose values are descriptors, or arrays of them.
const ImageKeys& imageKeys();

// Calls back for each descriptor, in the order of the document: the object under one of the keys
// (null: imageKeys()), each element, of whatever type, of an array there. What a descriptor holds
// is not searched. Nothing is looked for below kMaximumJsonDepth levels.
void enumerateImagesInResponse(const json::value& response,
                               FunctionRef<void(const json::value&)> callback,
                               const ImageKeys* keys = nullptr);

// The descriptors that have an identifier, and no bytes.
std::vector<ImageDescriptor> collectResponseImageIdentifiers(const json::value& response);

// URLs to fetch, each once.
struct OrderedImages {
  std::unordered_set<std::string> seen;
  std::vector<std::string> primary;
  std::vector<std::string> secondary;  // what may stand in for one of the primary ones
};

// Adds a descriptor's URLs to the lists, and their hosts to `hosts` unless that is null. URLs
// without a host count as absent.
void collectOrderedImages(const ImageDescriptor& descriptor, const ZLKBag& bag, ImageHosts* hosts,
                          OrderedImages& images);

}  // namespace zelkord
