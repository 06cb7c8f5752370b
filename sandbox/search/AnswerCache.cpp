#include "sandbox/search/AnswerCache.h"

namespace sandbox {

std::optional<Answer> AnswerCache::find(const std::string& key) {
  const std::lock_guard lock(mutex_);
  const auto found = byKey_.find(key);
  if (found == byKey_.end()) return std::nullopt;
  slots_.splice(slots_.begin(), slots_, found->second);
  return found->second->answer;
}

void AnswerCache::insert(const std::string& key, Answer answer) {
  const std::lock_guard lock(mutex_);
  if (const auto found = byKey_.find(key); found != byKey_.end()) {
    found->second->answer = std::move(answer);
    return;
  }
  slots_.push_front({key, std::move(answer)});
  byKey_.emplace(slots_.front().key, slots_.begin());
  if (slots_.size() <= capacity_) return;
  byKey_.erase(slots_.back().key);
  slots_.pop_back();
}

void AnswerCache::clear() {
  const std::lock_guard lock(mutex_);
  byKey_.clear();
  slots_.clear();
}

}  // namespace sandbox
