#include "platform/linux/log/LogFolding.h"

#include <fmt/format.h>

#include <algorithm>
#include <functional>
#include <utility>

#include "platform/linux/log/LogLine.h"

namespace zelkord {
namespace {

constexpr Duration kFoldingSecond = 1s;
constexpr Duration kFoldingMinute = 60s;

std::string summaryText(std::uint64_t count, bool isOneText, const std::string& text) {
  return isOneText ? fmt::format("repeated {} times: {}", count, text)
                   : fmt::format("{} more lines like this one left out: {}", count, text);
}

}  // namespace

bool LogFolding::admit(SteadyTime now, Place place, std::string_view text,
                       std::vector<Summary>& due) {
  if (now >= firstDue_) _takeDue(now, due);
  const auto at = seconds_.try_emplace(std::move(place)).first;
  auto& second = at->second;
  if (now >= second.end) second = {.end = now + kFoldingSecond, .minute = second.minute};
  if (_hasRoom(now, second, text)) return true;
  _fold(at, text);
  return false;
}

bool LogFolding::_hasRoom(SteadyTime now, Second& second, std::string_view text) {
  auto& minute = second.minute;
  if (now >= minute.end) minute = {.end = now + kFoldingMinute};
  const auto bytes = std::min(text.size(), kLongestLogLine);
  if (second.lines >= kLines || second.bytes + bytes > kBytesOfASecond ||
      minute.bytes + bytes > kBytesOfAMinute) {
    return false;
  }
  auto& times = second.texts[std::hash<std::string_view>()(text)];
  if (times >= kEqualLines) return false;
  ++times;
  ++second.lines;
  second.bytes += bytes;
  minute.bytes += bytes;
  return true;
}

void LogFolding::_fold(Seconds::iterator at, std::string_view text) {
  auto& second = at->second;
  if (second.folded++ == 0) {
    untold_.push_back(at);
    firstDue_ = std::min(firstDue_, second.end);
  } else if (second.lastFolded != text) {
    second.isOneText = false;
  }
  second.lastFolded.assign(text.substr(0, 4096));
}

void LogFolding::_takeDue(SteadyTime now, std::vector<Summary>& due) {
  firstDue_ = SteadyTime::max();
  std::erase_if(untold_, [&](const Seconds::iterator& at) {
    auto& [place, second] = *at;
    if (now < second.end) {
      firstDue_ = std::min(firstDue_, second.end);
      return false;
    }
    due.push_back({place.level, place.category,
                   summaryText(second.folded, second.isOneText, second.lastFolded)});
    second = {.minute = second.minute};
    return true;
  });
}

void LogFolding::takeAll(std::vector<Summary>& due) { _takeDue(SteadyTime::max(), due); }

}  // namespace zelkord
