#include "zelkord/network/request/ZelkorURLRequestBuilder.h"

#include <algorithm>
#include <utility>

#include "base/Text.h"

namespace zelkord {
namespace {

// More than any request of ours adds, so that building one allocates once.
constexpr std::size_t kUsualItems = 32;
constexpr std::size_t kUsualHeaders = 16;

bool isBefore(const URLQueryItem& item, std::string_view name) {
  return lessByCodeUnit(item.name, name);
}

template <typename Headers>
auto findHeader(Headers& headers, std::string_view name) {
  return std::find_if(headers.begin(), headers.end(),
                      [name](const auto& header) { return header.first == name; });
}

}  // namespace

std::optional<ZelkorURLRequestBuilder> ZelkorURLRequestBuilder::make(std::string_view url) {
  auto components = URLComponents::parse(url);
  if (!components) return std::nullopt;
  return ZelkorURLRequestBuilder(std::move(*components));
}

ZelkorURLRequestBuilder::ZelkorURLRequestBuilder(URLComponents components)
    : urlComponents_(std::move(components)) {
  auto& items = urlComponents_.queryItems;
  std::stable_sort(items.begin(), items.end(),
                   [](const auto& a, const auto& b) { return lessByCodeUnit(a.name, b.name); });
  const auto sameName = [](const auto& a, const auto& b) { return a.name == b.name; };
  // From the back, so that the last of a name is the one that stays.
  items.erase(items.begin(), std::unique(items.rbegin(), items.rend(), sameName).base());
  items.reserve(items.size() + kUsualItems);
  httpHeaders_.reserve(kUsualHeaders);
}

bool ZelkorURLRequestBuilder::containsQueryItemWithName(std::string_view name) const {
  return _stands(_place(name), name);
}

void ZelkorURLRequestBuilder::forceQueryItem(URLQueryItem item) {
  auto& items = urlComponents_.queryItems;
  const auto place = _place(item.name);
  if (!_stands(place, item.name)) {
    items.insert(place, std::move(item));
    return;
  }
  items[static_cast<std::size_t>(place - items.cbegin())].value = std::move(item.value);
}

void ZelkorURLRequestBuilder::forceQueryItemWithName(std::string_view name,
                                                     std::optional<std::string> value) {
  forceQueryItem({std::string(name), std::move(value)});
}

void ZelkorURLRequestBuilder::forceQueryItemsFromArray(std::span<const QueryItem> items) {
  for (const auto& [name, value] : items) forceQueryItem({name, value});
}

void ZelkorURLRequestBuilder::defaultQueryItem(URLQueryItem item) {
  const auto place = _place(item.name);
  if (!_stands(place, item.name)) urlComponents_.queryItems.insert(place, std::move(item));
}

void ZelkorURLRequestBuilder::defaultQueryItemWithName(std::string_view name,
                                                       std::optional<std::string> value) {
  defaultQueryItem({std::string(name), std::move(value)});
}

bool ZelkorURLRequestBuilder::containsHttpHeaderWithName(std::string_view name) const {
  return findHeader(httpHeaders_, name) != httpHeaders_.end();
}

void ZelkorURLRequestBuilder::forceHttpHeaderWithName(std::string_view name, std::string value) {
  const auto found = findHeader(httpHeaders_, name);
  if (found != httpHeaders_.end()) {
    found->second = std::move(value);
  } else {
    httpHeaders_.emplace_back(name, std::move(value));
  }
}

void ZelkorURLRequestBuilder::defaultHttpHeaderWithName(std::string_view name, std::string value) {
  if (!containsHttpHeaderWithName(name)) httpHeaders_.emplace_back(name, std::move(value));
}

URLRequest ZelkorURLRequestBuilder::createMutableUrlRequest() const {
  return {.url = urlComponents_.string(), .headers = httpHeaders_};
}

auto ZelkorURLRequestBuilder::_place(std::string_view name) const -> Items::const_iterator {
  const auto& items = urlComponents_.queryItems;
  return std::lower_bound(items.begin(), items.end(), name, isBefore);
}

bool ZelkorURLRequestBuilder::_stands(Items::const_iterator place, std::string_view name) const {
  return place != urlComponents_.queryItems.end() && place->name == name;
}

}  // namespace zelkord
