#include "platform/api/BoundedCounters.h"

namespace zelkord {
namespace {

std::int64_t saturatedSum(std::int64_t a, std::int64_t b) {
  std::int64_t sum = 0;
  if (!__builtin_add_overflow(a, b, &sum)) return sum;
  return b > 0 ? INT64_MAX : INT64_MIN;
}

// What has a part from a client has a word of ours behind it, so that it is none of these, but for
// the few with one of these groups' names.
bool isOfOwnWords(std::string_view key) {
  constexpr std::string_view kPrefix = "com.quenta.zelkord.";
  if (!key.starts_with(kPrefix)) return false;
  key.remove_prefix(kPrefix.size());
  for (const std::string_view group : {"limit.", "bag.", "dp."}) {
    if (!key.starts_with(group)) continue;
    key.remove_prefix(group.size());
    break;
  }
  return key.find('.') == std::string_view::npos;
}

}  // namespace

void BoundedCounters::add(std::string_view key, std::int64_t amount) {
  auto& value = _place(key);
  value = saturatedSum(value, amount);
}

void BoundedCounters::set(std::string_view key, std::int64_t value) {
  auto& place = _place(key);
  const auto own = values_.find(key);
  place = own != values_.end() && &place == &own->second ? value : saturatedSum(place, value);
}

std::int64_t& BoundedCounters::_place(std::string_view key) {
  const auto found = key.size() <= kMaximumKeySize ? values_.find(key) : values_.end();
  if (found != values_.end()) return found->second;
  if (!_hasRoomFor(key)) key = kOthers;
  const auto [place, isNew] = values_.try_emplace(std::string(key), 0);
  if (isNew && !isOfOwnWords(key)) ++ofClients_;
  return place->second;
}

// The last place is kept for the others.
bool BoundedCounters::_hasRoomFor(std::string_view key) const {
  if (key.size() > kMaximumKeySize) return false;
  if (!isOfOwnWords(key)) return ofClients_ + 1 < kMaximumKeys - kKeptForOwnWords;
  return values_.size() - values_.count(kOthers) + 1 < kMaximumKeys;
}

}  // namespace zelkord
