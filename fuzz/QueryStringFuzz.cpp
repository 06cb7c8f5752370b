// Reads any text as a URL, and as query items to be written.

#include <cstdint>
#include <string_view>

#include "base/Check.h"
#include "base/Text.h"
#include "zelkord/network/request/ZelkorURLRequestBuilder.h"

namespace zelkord {
namespace {

void checkItems(const std::vector<URLQueryItem>& items) {
  for (std::size_t i = 1; i < items.size(); ++i) {
    ZK_CHECK(lessByCodeUnit(items[i - 1].name, items[i].name), "items are sorted and unique");
  }
}

// What was written reads back, and is written the same way again.
void checkWritten(const URLRequest& request) {
  const auto components = URLComponents::parse(request.url);
  if (!components) {  // escapes make it longer
    ZK_CHECK(request.url.size() > kMaximumURLLength, "a URL of ours is a URL");
    return;
  }
  checkItems(components->queryItems);
  ZK_CHECK(ZelkorURLRequestBuilder(*components).createUrlRequest().url == request.url,
           "writing is idempotent");
  for (const char c : std::string_view(request.url).substr(components->base.size())) {
    ZK_CHECK(c > ' ' && c < 0x7F && c != ';', "a query is plain ASCII");
  }
}

void readAsURL(std::string_view text) {
  const auto builder = ZelkorURLRequestBuilder::make(text);
  if (!builder) return;
  auto request = builder->createUrlRequest();
  if (const auto fragment = request.url.find('#'); fragment != std::string::npos) {
    request.url.resize(fragment);
  }
  checkWritten(request);
}

// Pieces between zero characters are names and values in turn.
void writeAsItems(std::string_view text) {
  auto builder = *ZelkorURLRequestBuilder::make("https://host/path");
  std::string lastName = "a";
  std::string lastValue;
  while (!text.empty()) {
    const auto name = text.substr(0, text.find('\0'));
    text.remove_prefix(std::min(name.size() + 1, text.size()));
    const auto value = text.substr(0, text.find('\0'));
    text.remove_prefix(std::min(value.size() + 1, text.size()));
    lastName = name;
    lastValue = value;
    builder.forceQueryItemsFromArray(std::vector<QueryItem>{{lastName, lastValue}});
  }
  const auto request = builder.createUrlRequest();
  checkWritten(request);
  const auto components = URLComponents::parse(request.url);
  if (!components || !builder.containsQueryItemWithName(lastName)) return;
  for (const auto& item : components->queryItems) {
    if (item.name == lastName) ZK_CHECK(item.value == lastValue, "a value survives");
  }
}

}  // namespace
}  // namespace zelkord

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  zelkord::readAsURL(text);
  zelkord::writeAsItems(text);
  return 0;
}
