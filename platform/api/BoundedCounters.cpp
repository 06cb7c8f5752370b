#include "platform/api/BoundedCounters.h"

namespace zelkord {
namespace {

std::int64_t saturatedSum(std::int64_t a, std::int64_t b) {
  std::int64_t sum = 0;
  if (!__builtin_add_overflow(a, b, &sum)) return sum;
  return b > 0 ? INT64_MAX : INT64_MIN;
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

// The last place is kept for the others.
std::int64_t& BoundedCounters::_place(std::string_view key) {
  const auto found = key.size() <= kMaximumKeySize ? values_.find(key) : values_.end();
  if (found != values_.end()) return found->second;
  const auto own = values_.size() - values_.count(kOthers);
  const bool fits = key.size() <= kMaximumKeySize && own + 1 < kMaximumKeys;
  return values_.try_emplace(std::string(fits ? key : kOthers), 0).first->second;
}

}  // namespace zelkord
