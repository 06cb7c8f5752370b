#include "sandbox/service/EmbeddedImages.h"

#include <boost/json/object.hpp>
#include <boost/json/serialize.hpp>
#include <vector>

#include "sandbox/service/KeyReader.h"

namespace sandbox {

namespace json = boost::json;

namespace {

constexpr std::uint64_t kMostDescriptors = 100'000;
constexpr std::uint64_t kDeepest = 100'000;

// What is to be embedded. The lists are used in turn.
struct Wish {
  std::uint64_t count = 1;
  std::uint64_t depth = 0;   // containers around all of it
  std::uint64_t perKey = 1;  // descriptors under one key; above 1 they are an array
  std::vector<std::string> keys;
  std::vector<std::string> urls;  // "{n}" stands for the descriptor's number, from 0
  std::vector<std::string> ids;   // likewise
};

std::string numbered(std::string text, std::uint64_t number) {
  const std::size_t mark = text.find("{n}");
  if (mark != std::string::npos) text.replace(mark, 3, std::to_string(number));
  return text;
}

std::string descriptorText(const Wish& wish, std::uint64_t number) {
  json::object descriptor;
  if (!wish.urls.empty())
    descriptor["url"] = numbered(wish.urls[number % wish.urls.size()], number);
  if (!wish.ids.empty()) descriptor["id"] = numbered(wish.ids[number % wish.ids.size()], number);
  return json::serialize(descriptor);
}

// {"icon":DESCRIPTOR} or {"icon":[DESCRIPTOR,...]}, with the descriptors from `first` on.
std::string holderText(const Wish& wish, std::uint64_t first) {
  const std::string& key = wish.keys[first / wish.perKey % wish.keys.size()];
  const std::uint64_t end = std::min(first + wish.perKey, wish.count);
  std::string text = "{" + json::serialize(json::string(key)) + ":";
  if (wish.perKey > 1) text += "[";
  for (std::uint64_t number = first; number < end; ++number) {
    if (number > first) text += ",";
    text += descriptorText(wish, number);
  }
  return text + (wish.perKey > 1 ? "]}" : "}");
}

// Arrays and objects by turns, the holders in the innermost.
std::string memberText(const Wish& wish) {
  std::string text = "\"embedded_images\":";
  for (std::uint64_t level = 0; level < wish.depth; ++level)
    text += level % 2 == 0 ? "{\"inner\":" : "[";
  text += "[";
  for (std::uint64_t first = 0; first < wish.count; first += wish.perKey) {
    if (first > 0) text += ",";
    text += holderText(wish, first);
  }
  text += "]";
  for (std::uint64_t level = wish.depth; level > 0; --level) text += level % 2 == 1 ? "}" : "]";
  return text + ",";
}

Wish readWish(KeyReader& reader) {
  Wish wish;
  wish.count = reader.number("count", 1, kMostDescriptors);
  wish.depth = reader.number("depth", 0, kDeepest);
  wish.perKey = reader.number("per_key", 1, kMostDescriptors);
  if (wish.perKey == 0) reader.fail("per_key");
  wish.keys = reader.texts("keys");
  if (wish.keys.empty()) wish.keys = {"image"};
  wish.urls = reader.texts("urls");
  wish.ids = reader.texts("ids");
  return wish;
}

}  // namespace

std::optional<Failure> EmbeddedImages::set(const json::value& value) {
  if (!value.is_object()) return Failure{"not a JSON object"};
  KeyReader reader(value.get_object());
  const Wish wish = readWish(reader);
  const auto& wrong = reader.finish();
  if (!wrong.empty()) return Failure{"bad value of \"" + wrong + "\", or no such key"};
  auto member = std::make_shared<const std::string>(memberText(wish));
  const std::lock_guard lock(mutex_);
  member_ = std::move(member);
  return std::nullopt;
}

void EmbeddedImages::clear() {
  const std::lock_guard lock(mutex_);
  member_ = nullptr;
}

void EmbeddedImages::addTo(Reply& reply) const {
  std::shared_ptr<const std::string> member;
  {
    const std::lock_guard lock(mutex_);
    member = member_;
  }
  if (!member || !reply.bodyText().starts_with("[{\"")) return;
  reply.body = std::make_shared<const std::string>("[{" + *member + reply.bodyText().substr(2));
  reply.gzipBody = nullptr;
  setHeader(reply.headers, "Cache-Control", "no-store");
}

}  // namespace sandbox
