#include "sandbox/service/Misbehaviour.h"

#include <algorithm>
#include <array>
#include <utility>

#include "sandbox/core/Gzip.h"
#include "sandbox/service/KeyReader.h"

namespace sandbox {

namespace json = boost::json;

namespace {

constexpr std::uint64_t kMostBytes = 1ULL << 30U;
constexpr std::uint64_t kStandardBomb = 100ULL << 20U;
constexpr std::uint64_t kStandardBig = 10ULL << 20U;
constexpr std::uint64_t kStandardDepth = 100'000;
constexpr std::uint64_t kStandardIntervalMs = 50;
constexpr std::uint64_t kLongestMs = 3'600'000;

constexpr std::array<std::pair<std::string_view, MisbehaviourKind>, 14> kKindNames = {{
    {"broken_json", MisbehaviourKind::BrokenJson},
    {"truncated", MisbehaviourKind::Truncated},
    {"endless", MisbehaviourKind::Endless},
    {"close", MisbehaviourKind::Close},
    {"close_after_headers", MisbehaviourKind::CloseAfterHeaders},
    {"wrong_digest", MisbehaviourKind::WrongDigest},
    {"not_http", MisbehaviourKind::NotHttp},
    {"slow", MisbehaviourKind::Slow},
    {"redirect", MisbehaviourKind::Redirect},
    {"gzip_bomb", MisbehaviourKind::GzipBomb},
    {"big", MisbehaviourKind::Big},
    {"deep_json", MisbehaviourKind::DeepJson},
    {"pad", MisbehaviourKind::Pad},
    {"wrong_length", MisbehaviourKind::WrongLength},
}};

MisbehaviourKind readKind(KeyReader& reader) {
  const auto name = reader.text("kind");
  if (!name) return MisbehaviourKind::None;
  const auto found = std::find_if(kKindNames.begin(), kKindNames.end(),
                                  [&](const auto& pair) { return pair.first == *name; });
  if (found != kKindNames.end()) return found->second;
  reader.fail("kind");
  return MisbehaviourKind::None;
}

std::string bigJson(std::uint64_t bytes) {
  return "[\"" + std::string(std::max<std::uint64_t>(bytes, 4) - 4, 'x') + "\"]";
}

Reply redirectReply(const std::string& location) {
  Reply reply = Reply::empty(302);
  reply.headers.emplace_back("Location", location);
  return reply;
}

Reply bombReply(std::uint64_t bytes) {
  Reply reply = Reply::json(200, gzipOfBlanks(bytes));
  reply.headers.emplace_back("Content-Encoding", "gzip");
  reply.mayPack = false;
  return reply;
}

std::optional<Reply> replyOfKind(const Misbehaviour& misbehaviour) {
  switch (misbehaviour.kind) {
    case MisbehaviourKind::BrokenJson:
      return Reply::json(200, R"([{"status":"OK","query":"snow","results":[{"title":)");
    case MisbehaviourKind::Close:
      return Reply::empty(0);
    case MisbehaviourKind::WrongDigest:
      return Reply::error(400, "X-Quenta-Digest does not match");
    case MisbehaviourKind::NotHttp:
      return Reply::json(0, std::string("\x01\x02 this is not HTTP \xFF\r\n\r\n"));
    case MisbehaviourKind::Redirect:
      return redirectReply(misbehaviour.location);
    case MisbehaviourKind::GzipBomb:
      return bombReply(misbehaviour.bytes);
    case MisbehaviourKind::Big:
      return Reply::json(200, bigJson(misbehaviour.bytes));
    case MisbehaviourKind::DeepJson:
      return Reply::json(
          200, std::string(misbehaviour.depth, '[') + std::string(misbehaviour.depth, ']'));
    case MisbehaviourKind::Endless:
      return Reply::json(200, {});
    default:
      return std::nullopt;
  }
}

Delivery deliveryOfKind(MisbehaviourKind kind) {
  switch (kind) {
    case MisbehaviourKind::Close:
      return Delivery::Close;
    case MisbehaviourKind::CloseAfterHeaders:
      return Delivery::CloseAfterHeaders;
    case MisbehaviourKind::Truncated:
      return Delivery::Truncated;
    case MisbehaviourKind::Endless:
      return Delivery::Endless;
    case MisbehaviourKind::Slow:
      return Delivery::Slow;
    case MisbehaviourKind::NotHttp:
      return Delivery::NotHttp;
    case MisbehaviourKind::WrongLength:
      return Delivery::WrongLength;
    default:
      return Delivery::Ordinary;
  }
}

std::uint64_t standardBytes(MisbehaviourKind kind) {
  return kind == MisbehaviourKind::GzipBomb ? kStandardBomb : kStandardBig;
}

bool fits(const Misbehaviour& rule, std::string_view path) {
  if (rule.path.ends_with('*'))
    return path.starts_with(std::string_view(rule.path).substr(0, rule.path.size() - 1));
  return path == rule.path;
}

}  // namespace

Outcome<Misbehaviour> parseMisbehaviour(const json::value& value) {
  if (!value.is_object()) return Failure{"not a JSON object"};
  KeyReader reader(value.get_object());
  Misbehaviour rule;
  rule.path = reader.text("path").value_or("*");
  rule.remaining = reader.number("count", 1, UINT64_MAX);
  rule.forever = reader.has("count") && rule.remaining == 0;
  rule.skip = reader.number("skip", 0, UINT64_MAX);
  rule.kind = readKind(reader);
  rule.delay = std::chrono::milliseconds(reader.number("delay_ms", 0, kLongestMs));
  rule.interval =
      std::chrono::milliseconds(reader.number("interval_ms", kStandardIntervalMs, kLongestMs));
  const auto status = static_cast<unsigned>(reader.number("status", 200, 999));
  if (reader.has("status")) rule.status = status;
  rule.body = reader.text("body");
  rule.location = reader.text("location").value_or("/");
  rule.bytes = reader.number("bytes", standardBytes(rule.kind), kMostBytes);
  rule.depth = reader.number("depth", kStandardDepth, kMostBytes);
  rule.headers = reader.headers("headers");
  const auto& wrong = reader.finish();
  if (!wrong.empty()) return Failure{"bad value of \"" + wrong + "\", or no such key"};
  return rule;
}

std::optional<Reply> replacementFor(const Misbehaviour& misbehaviour) {
  auto reply = replyOfKind(misbehaviour);
  if (!reply && (misbehaviour.status || misbehaviour.body))
    reply = Reply::json(misbehaviour.status.value_or(200), {});
  if (!reply) return std::nullopt;
  if (misbehaviour.status && reply->status != 0) reply->status = *misbehaviour.status;
  if (misbehaviour.body) reply->body = std::make_shared<const std::string>(*misbehaviour.body);
  return reply;
}

void distort(const Misbehaviour& misbehaviour, Reply& reply) {
  reply.delay = misbehaviour.delay;
  reply.interval = misbehaviour.interval;
  reply.delivery = deliveryOfKind(misbehaviour.kind);
  reply.announcedLength = misbehaviour.bytes;
  for (const auto& [name, value] : misbehaviour.headers) setHeader(reply.headers, name, value);
}

void Misbehaviours::add(Misbehaviour misbehaviour) {
  const std::lock_guard lock(mutex_);
  rules_.push_back(std::move(misbehaviour));
}

std::optional<Misbehaviour> Misbehaviours::take(std::string_view path) {
  const std::lock_guard lock(mutex_);
  const auto rule = std::find_if(rules_.begin(), rules_.end(),
                                 [&](const auto& each) { return fits(each, path); });
  if (rule == rules_.end()) return std::nullopt;
  if (rule->skip > 0) {
    --rule->skip;
    return std::nullopt;
  }
  Misbehaviour taken = *rule;
  if (!rule->forever && --rule->remaining == 0) rules_.erase(rule);
  return taken;
}

void Misbehaviours::clear() {
  const std::lock_guard lock(mutex_);
  rules_.clear();
}

}  // namespace sandbox
