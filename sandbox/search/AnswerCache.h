#pragma once

#include <cstddef>
#include <list>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>

namespace sandbox {

// The text of an answer, and the same packed with gzip where that pays.
struct Answer {
  std::shared_ptr<const std::string> body;
  std::shared_ptr<const std::string> gzipBody;
};

// Keeps the most recently used answers by what was asked.
//
// Threading: any thread. Errors: none; an answer that is gone is made again.
class AnswerCache final {
 public:
  explicit AnswerCache(std::size_t capacity) : capacity_(capacity) {}

  std::optional<Answer> find(const std::string& key);
  void insert(const std::string& key, Answer answer);
  void clear();

 private:
  struct Slot {
    std::string key;
    Answer answer;
  };

  const std::size_t capacity_;
  std::mutex mutex_;
  std::list<Slot> slots_;  // most recently used first
  std::unordered_map<std::string_view, std::list<Slot>::iterator> byKey_;
};

}  // namespace sandbox
