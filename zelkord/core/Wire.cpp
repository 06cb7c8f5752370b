#include "zelkord/core/Wire.h"

#include <fmt/core.h>

#include <algorithm>
#include <cmath>

#include "base/Text.h"
#include "corezelkor/internal/RequestKinds.h"

namespace zelkord {
namespace {

constexpr std::uint32_t kLastTriggerEvent = 19;
constexpr std::size_t kMaximumQueryItems = 256;
constexpr std::size_t kMaximumImages = 1000;
constexpr std::size_t kMaximumImageBytes = 64u << 20;  // the longest array that D-Bus has
constexpr std::size_t kEntryOverhead = 20;             // lengths, terminator, padding

// Reads the members of a dictionary, each once; the first fault is kept.
class DictionaryReader {
 public:
  explicit DictionaryReader(const ipc::Dictionary& dictionary) : dictionary_(dictionary) {}

  template <typename T>
  void read(std::string_view key, T& value) {
    const auto found = dictionary_.find(key);
    if (found == dictionary_.end()) return;
    if (const auto* typed = found->second.get<T>()) {
      value = *typed;
    } else {
      refuse(ipc::kInvalidArgs, fmt::format("\"{}\" has the wrong type", key));
    }
  }

  template <typename T>
  void readIfPresent(std::string_view key, std::optional<T>& value) {
    if (dictionary_.contains(key)) read(key, value.emplace());
  }

  void refuse(std::string_view errorName, std::string text) {
    if (!fault_) fault_ = WireFault{errorName, std::move(text)};
  }

  std::optional<WireFault> fault() && { return std::move(fault_); }

  template <typename T>
  Decoded<T> finish(T value) && {
    if (fault_) return *std::move(fault_);
    return value;
  }

 private:
  const ipc::Dictionary& dictionary_;
  std::optional<WireFault> fault_;
};

void checkQueryItems(DictionaryReader& reader, const std::vector<QueryItem>& items) {
  if (items.size() > kMaximumQueryItems) {
    reader.refuse(ipc::kLimitsExceeded, "more than 256 \"queryItems\"");
  }
  for (const auto& [name, value] : items) {
    if (hasControlCharacters(name) || hasControlCharacters(value)) {
      reader.refuse(ipc::kInvalidArgs, "control characters in \"queryItems\"");
    }
  }
}

void checkCommonFields(DictionaryReader& reader, const ZLKRequest& request) {
  checkQueryItems(reader, request.queryItems);
  if (request.triggerEvent > kLastTriggerEvent) {
    reader.refuse(ipc::kInvalidArgs, "\"triggerEvent\" is above 19");
  }
  if (!std::isfinite(request.scale) || request.scale < 0) {
    reader.refuse(ipc::kInvalidArgs, "\"scale\" is not a finite number of 0 or more");
  }
}

ipc::StringMap headerMap(const HeaderFields& headers) {
  ipc::StringMap map;
  for (const auto& [name, value] : headers) map[name] = value;
  return map;
}

}  // namespace

Decoded<ZLKSessionConfiguration> decodeConfiguration(const ipc::Dictionary& dictionary) {
  DictionaryReader reader(dictionary);
  ZLKSessionConfiguration configuration;
  reader.read("identifier", configuration.identifier);
  reader.read("userAgent", configuration.userAgent);
  if (hasControlCharacters(configuration.identifier) ||
      hasControlCharacters(configuration.userAgent)) {
    reader.refuse(ipc::kInvalidArgs, "control characters in the configuration");
  }
  return std::move(reader).finish(std::move(configuration));
}

Decoded<MutableRequest> decodeRequest(const std::string& kind, const ipc::Dictionary& dictionary) {
  const auto* known = requestKindNamed(kind);
  if (!known) return MutableRequest();
  auto request = known->make();
  DictionaryReader reader(dictionary);
  const auto read = [&](std::string_view key, auto& value) { reader.read(key, value); };
  visitFields(*request, commonRequestFields(), read);
  checkCommonFields(reader, *request);
  visitFields(*request, known->fields, read);
  return std::move(reader).finish(std::move(request));
}

Decoded<std::vector<ImageDescriptor>> decodeImageDescriptors(
    const std::vector<ipc::Dictionary>& dictionaries) {
  if (dictionaries.size() > kMaximumImages) {
    return WireFault{ipc::kLimitsExceeded, "more than 1000 descriptors"};
  }
  std::vector<ImageDescriptor> descriptors;
  for (const auto& dictionary : dictionaries) {
    DictionaryReader reader(dictionary);
    auto& descriptor = descriptors.emplace_back();
    reader.readIfPresent("url", descriptor.url);
    reader.readIfPresent("id", descriptor.id);
    reader.read("data", descriptor.data);
    if (auto fault = std::move(reader).fault()) return *std::move(fault);
  }
  return descriptors;
}

std::string jsonText(const json::value& value) {
  return withEscapedNoncharacters(json::serialize(value));
}

ipc::Dictionary encodeBag(const ZLKBag* bag) {
  ipc::Dictionary dictionary;
  if (!bag) return dictionary;
  if (auto version = bag->version()) dictionary["version"] = *std::move(version);
  dictionary["enabled"] = bag->isEnabled();
  dictionary["feedbackEnabled"] = bag->feedbackEnabled();
  dictionary["rawBag"] = jsonText(*bag->rawBag());
  return dictionary;
}

ipc::Dictionary encodeError(const std::optional<Error>& error) {
  ipc::Dictionary dictionary;
  if (!error) return dictionary;
  ipc::Dictionary info;
  for (const auto& [key, value] : error->userInfo) info[key] = value;
  dictionary["domain"] = error->domain;
  dictionary["code"] = error->code;
  dictionary["userInfo"] = std::move(info);
  return dictionary;
}

ipc::Dictionary encodeReply(const std::optional<ZLKReply>& reply) {
  ipc::Dictionary dictionary;
  if (!reply) return dictionary;
  dictionary["scale"] = reply->scale;
  dictionary["data"] = reply->data;
  if (reply->geoSessionEntityString) {
    dictionary["geoSessionEntityString"] = *reply->geoSessionEntityString;
  }
  if (reply->httpRequest) {
    dictionary["httpRequest"] = ipc::Dictionary{
        {"url", reply->httpRequest->url}, {"headers", headerMap(reply->httpRequest->headers)}};
  }
  if (reply->httpResponse) {
    dictionary["httpResponse"] =
        ipc::Dictionary{{"url", reply->httpResponse->url},
                        {"status", reply->httpResponse->status},
                        {"headers", headerMap(reply->httpResponse->headers)}};
  }
  return dictionary;
}

ipc::DataMap encodeImages(LoadedImages images) {
  std::size_t size = 0;
  const auto first = std::ranges::find_if(images, [&size](const auto& image) {
    size += image.first.size() + image.second.size() + kEntryOverhead;
    return size > kMaximumImageBytes;
  });
  images.erase(first, images.end());
  return images;
}

}  // namespace zelkord
