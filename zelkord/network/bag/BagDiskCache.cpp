#include "zelkord/network/bag/BagDiskCache.h"

#include <algorithm>
#include <cerrno>

#include "zelkord/assembly/Assembly.h"
#include "zelkord/network/bag/BagResponse.h"

namespace zelkord {
namespace {

constexpr unsigned kBagFileMode = 0600;
// A property list may take several times the bytes of the JSON text that it holds.
constexpr std::uint64_t kBagFileGrowth = 16;

bool isPosixError(const Error& error, int number) {
  return error.domain == kPOSIXErrorDomain && error.code == number;
}

std::string_view kindName(const json::value& value) {
  const auto name = json::to_string(value.kind());
  return {name.data(), name.size()};
}

}  // namespace

void BagDiskCache::write(const json::object& dictionary) const {
  const auto& log = assembly_.log(Category::Bag);
  if (!assembly_.diskBagCacheEnabled()) {
    log.debug("skipping writing bag to disk because the flag is disabled");
    return;
  }
  Error error;
  const auto path = _pathToCachedBag(&error);
  if (!path) {
    log.error("Couldn't get path to cache bag.  Error: {}.", error.description());
    return;
  }
  const auto bytes = assembly_.platform().propertyLists.encode(dictionary, &error);
  if (!bytes) {
    _logEncodingError(error, *path);
  } else if (assembly_.fileManager().writeAtomically(*path, *bytes, kBagFileMode)) {
    log.error("Could not write to {}", *path);
  }
}

void BagDiskCache::_logEncodingError(const Error& error, const std::string& path) const {
  const auto& log = assembly_.log(Category::Bag);
  if (isPosixError(error, ENOMEM)) {
    log.error("Error creating bag cache file stream to path {}.", path);
  } else {
    log.error("Error writing bag to persistent cache: {}.", error.description());
  }
}

std::optional<json::object> BagDiskCache::read() const {
  const auto& log = assembly_.log(Category::Bag);
  if (!assembly_.diskBagCacheEnabled()) {
    log.debug("skipping check for bag on disk because the flag is disabled");
    return std::nullopt;
  }
  Error error;
  const auto path = _pathToCachedBag(&error);
  if (!path) return std::nullopt;
  const auto bytes = assembly_.fileManager().read(*path, _maximumFileSize(), &error);
  auto value = bytes ? assembly_.platform().propertyLists.decode(*bytes, &error) : std::nullopt;
  if (!value) {
    if (!isPosixError(error, ENOENT)) {
      log.error("Error reading from bag cache: {}.", error.description());
    }
    return std::nullopt;
  }
  if (auto* dictionary = value->if_object()) return std::move(*dictionary);
  log.error("Unexpected class deserialized from bag cache: {}.", kindName(*value));
  return std::nullopt;
}

std::optional<std::string> BagDiskCache::_pathToCachedBag(Error* error) const {
  const auto& log = assembly_.log(Category::Bag);
  const auto& directory = assembly_.fileManager().directories().caches;
  if (directory.empty()) {
    *error = posixError(ENOENT);
    log.error("error getting cache directory {}", error->description());
    return std::nullopt;
  }
  if (const auto failure = assembly_.fileManager().createDirectory(directory)) {
    *error = *failure;
    log.error("error creating agent-specific cache directory {}", error->description());
    return std::nullopt;
  }
  return directory + "/bag.plist";
}

std::uint64_t BagDiskCache::_maximumFileSize() const {
  const auto bag = std::max(maximumBagSize(assembly_.userDefaults()), kDefaultMaximumBagSize);
  return bag > UINT64_MAX / kBagFileGrowth ? UINT64_MAX : bag * kBagFileGrowth;
}

}  // namespace zelkord
