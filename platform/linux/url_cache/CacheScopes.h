#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <string>
#include <vector>

#include "base/Namespace.h"

namespace zelkord {

// Within which of the cached answers of tasks a request may look, and where its own is kept. Each
// identity has a scope of its own, and so have the requests without one, from one ending of an
// identity to the next. What is stored by hand is in no scope.
//
// Threading: none of its own.
class CacheScopes final {
 public:
  using Scope = std::uint64_t;
  static constexpr Scope kByHand = 0;
  static constexpr Scope kEnded = ~Scope{0};  // has nothing and takes nothing

  // kEnded for an identity that has ended.
  Scope of(const std::string& identity);
  bool isLive(Scope scope) const;
  // Ends the identity's scope and that of requests without one, and gives those that there were.
  std::vector<Scope> end(const std::string& identity);

 private:
  std::map<std::string, Scope> live_;
  std::deque<std::string> ended_;  // the latest last
  Scope last_ = kByHand;
};

}  // namespace zelkord
