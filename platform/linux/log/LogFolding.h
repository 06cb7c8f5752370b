#pragma once

#include <compare>
#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "base/Time.h"
#include "platform/api/Log.h"

namespace zelkord {

// Keeps any one place in the code from driving everything else out of the log: what it says again
// and again in a second, and what it says beyond kLines or the bytes of a second or a minute, is
// counted, and told in one line with the next entry of whatever place after that second. There is
// no timer: an idle process stays idle.
//
// Threading: one thread at a time. Memory: some numbers for each place that has ever logged, and
// kLines numbers for each that has done so in the last second.
class LogFolding final {
 public:
  // Of one place a second: of the same text, and of all.
  static constexpr unsigned kEqualLines = 10;
  static constexpr unsigned kLines = 2000;
  // Bytes of the texts of one place: more than hundreds of typing clients cause, and few enough
  // that it takes a place minutes to fill the files.
  static constexpr std::size_t kBytesOfASecond = 256 * 1024;
  static constexpr std::size_t kBytesOfAMinute = 8 * 1024 * 1024;

  // `format` is null for an unknown one.
  struct Place {
    const void* format = nullptr;
    LogLevel level = LogLevel::Default;
    std::string category;

    friend auto operator<=>(const Place&, const Place&) = default;
  };
  struct Summary {
    LogLevel level;
    std::string category;
    std::string text;
  };

  // Whether the entry is to be written, after those that are put into `due`.
  bool admit(SteadyTime now, Place place, std::string_view text, std::vector<Summary>& due);
  // Everything that is not told yet.
  void takeAll(std::vector<Summary>& due);

 private:
  struct Minute {
    SteadyTime end{};
    std::size_t bytes = 0;
  };
  struct Second {
    SteadyTime end{};
    Minute minute;  // outlives the second
    unsigned lines = 0;
    std::size_t bytes = 0;
    std::unordered_map<std::size_t, unsigned> texts;  // by hash: how often
    std::uint64_t folded = 0;
    std::string lastFolded;
    bool isOneText = true;
  };
  using Seconds = std::map<Place, Second>;

  static bool _hasRoom(SteadyTime now, Second& second, std::string_view text);
  void _fold(Seconds::iterator at, std::string_view text);
  void _takeDue(SteadyTime now, std::vector<Summary>& due);

  Seconds seconds_;
  std::vector<Seconds::iterator> untold_;
  SteadyTime firstDue_ = SteadyTime::max();  // of those
};

}  // namespace zelkord
