#include "sandbox/service/Queries.h"

#include <boost/json/serialize.hpp>
#include <charconv>
#include <chrono>

#include "sandbox/core/Gzip.h"
#include "sandbox/core/Text.h"
#include "sandbox/http/Conditional.h"

namespace sandbox {

namespace json = boost::json;

namespace {

constexpr std::size_t kCachedAnswers = 2048;
constexpr std::size_t kSmallestPacked = 1024;
constexpr std::size_t kLongestKey = 2048;
constexpr std::size_t kMostPad = 16U << 20U;
constexpr std::size_t kFarthestOffset = 10'000;

std::size_t sizeItem(const Request& request, std::string_view name, std::size_t most) {
  const std::string text = request.itemOr(name);
  std::size_t number = 0;
  std::from_chars(text.data(), text.data() + text.size(), number);
  return std::min(number, most);
}

int hourNow() {
  const auto now = std::chrono::system_clock::now();
  return static_cast<int>(
      std::chrono::duration_cast<std::chrono::hours>(now.time_since_epoch()).count() % 24);
}

// All that an answer to a search depends on.
std::string searchKey(const Request& request, int hour) {
  std::string key = "s\n" + request.itemOr("q") + "\n" + request.itemOr("qtype") + "\n";
  if (request.item("qtype") == "zkw") key += request.itemOr("cc") + "\n" + std::to_string(hour);
  if (request.item("ltype")) key += "lookup";
  return key;
}

Reply paddedReply(Reply reply, std::size_t bytes) {
  reply.body = std::make_shared<const std::string>(padded(reply.bodyText(), bytes));
  reply.gzipBody = nullptr;
  reply.mayPack = false;
  return reply;
}

}  // namespace

std::string padded(const std::string& sets, std::size_t bytes) {
  static constexpr std::string_view kOpening = "[{\"pad\":\"";
  static constexpr std::string_view kClosing = "\",";
  const std::size_t least = sets.size() + kOpening.size() + kClosing.size() - 2;
  if (!sets.starts_with("[{") || least >= bytes) return sets;
  std::string text;
  text.reserve(bytes);
  text.append(kOpening).append(bytes - least, 'p').append(kClosing).append(sets, 2);
  return text;
}

Queries::Queries(SuggestionIndexPool& pool, std::string baseUrl)
    : writer_(std::move(baseUrl)),
      search_(pool, writer_),
      popular_(pool, writer_),
      lookup_(pool, writer_),
      cache_(kCachedAnswers) {}

Reply Queries::search(const Request& request) {
  const int hour = hourNow();
  Reply reply = _cached(searchKey(request, hour), "private, no-cache",
                        [&] { return _searchSets(request, hour); });
  const std::size_t pad = sizeItem(request, "pad", kMostPad);
  return pad > 0 ? paddedReply(std::move(reply), pad) : reply;
}

json::array Queries::_searchSets(const Request& request, int hour) const {
  if (request.item("qtype") == "zkw") return popular_.zeroKeyword(request.itemOr("cc"), hour);
  if (request.item("ltype")) return lookup_.lookup(request.itemOr("q"));
  return search_.search(request.itemOr("q"));
}

Reply Queries::more(const Request& request) {
  const std::size_t offset = sizeItem(request, "offset", kFarthestOffset);
  const std::string query = request.itemOr("q");
  return _cached("m\n" + query + "\n" + std::to_string(offset), "private, max-age=60",
                 [&] { return search_.more(query, offset); });
}

Reply Queries::card(const Request& request) {
  const auto cards = search_.card(static_cast<std::int64_t>(sizeItem(request, "id", INT64_MAX)));
  if (!cards) return Reply::error(404, "no such card");
  Reply reply = Reply::json(200, json::serialize(*cards));
  reply.headers.emplace_back("Cache-Control", "private, max-age=300");
  const std::string tag = entityTagOf(reply.bodyText());
  reply.headers.emplace_back("ETag", tag);
  return reply;
}

Reply Queries::_cached(const std::string& key, const std::string& cacheControl,
                       const std::function<json::array()>& make) {
  auto answer = key.size() <= kLongestKey ? cache_.find(key) : std::nullopt;
  if (!answer) {
    answer.emplace();
    answer->body = std::make_shared<const std::string>(json::serialize(make()));
    if (answer->body->size() >= kSmallestPacked) {
      answer->gzipBody = std::make_shared<const std::string>(gzip(*answer->body));
    }
    if (key.size() <= kLongestKey) cache_.insert(key, *answer);
  }
  Reply reply;
  reply.headers.emplace_back("Content-Type", "application/json");
  reply.headers.emplace_back("Cache-Control", cacheControl);
  reply.body = answer->body;
  reply.gzipBody = answer->gzipBody;
  return reply;
}

}  // namespace sandbox
