#pragma once

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

#include "base/Namespace.h"

namespace zelkor {

// Who makes feedback of a class.
enum class FeedbackOrigin { Client, Daemon };

// Whether what is sent of a record carries the identifiers of a query.
enum class QueryIds : std::uint8_t { None, Sent };

// What a kind of feedback says of itself, once.
struct FeedbackDescription {
  // Of its class; what only the daemon makes is named ZLK… or Zelkor…. A kind that exists as a
  // message only has the message's.
  std::string_view name;
  std::uint32_t type;  // its row in the table of event types
  QueryIds queryIds = QueryIds::Sent;

  constexpr bool isMessageOnly() const { return name.starts_with("CZ"); }
  constexpr FeedbackOrigin origin() const {
    const bool isDaemons = name.starts_with("ZLK") || name.starts_with("Zelkor");
    return isDaemons ? FeedbackOrigin::Daemon : FeedbackOrigin::Client;
  }
};

// The name of a kind's message: "CZ", then the class's name without "HV", "ZLK" or "Zelkor", with
// "Feedback" at the end.
class FeedbackMessageName {
 public:
  constexpr explicit FeedbackMessageName(std::string_view className) {
    for (const std::string_view prefix : {"HV", "ZLK", "Zelkor", "CZ"}) {
      if (!className.starts_with(prefix)) continue;
      className.remove_prefix(prefix.size());
      break;
    }
    constexpr std::string_view kEnd = "Feedback";
    _append("CZ");
    _append(className);
    if (!className.ends_with(kEnd)) _append(kEnd);
  }

  constexpr std::string_view view() const { return {text_.data(), size_}; }

 private:
  constexpr void _append(std::string_view part) {
    std::copy(part.begin(), part.end(), text_.begin() + size_);
    size_ += part.size();
  }

  std::array<char, 64> text_{};
  std::size_t size_ = 0;
};

template <typename Record>
inline constexpr FeedbackMessageName kMessageNameOf{Record::kDescription.name};

}  // namespace zelkor
