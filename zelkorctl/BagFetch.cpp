#include "zelkorctl/BagFetch.h"

#include <fmt/format.h>

#include <algorithm>
#include <cmath>

#include "zelkorctl/Printable.h"

namespace zelkorctl {

using namespace zelkor;

namespace {

// "12 s", "5 min" or "2 h 13 min".
std::string spanText(double seconds) {
  constexpr double kLongest = 1e9;
  const auto whole = std::lround(std::clamp(seconds, 0.0, kLongest));
  if (whole < 120) return fmt::format("{} s", whole);
  if (whole < 7200) return fmt::format("{} min", whole / 60);
  return fmt::format("{} h {} min", whole / 3600, whole / 60 % 60);
}

std::string failureText(const json::object& failure, double now) {
  std::string text = " failed";
  const auto time = numberIn(failure, "time");
  const auto reason = stringIn(failure, "reason");
  if (time) text += " " + spanText(now - *time) + " ago";
  if (reason) text += ": " + printable(*reason);
  return text;
}

}  // namespace

bool mayMeanNoBag(const std::optional<Error>& error) {
  if (!error || error->domain != kZLKErrorDomain || error->code != 1) return false;
  // Further results and cards wait for no bag; without one they may have no address.
  return error->reason() == "timeout" || error->reason() == "no URL";
}

std::optional<json::object> missingBagIn(std::string_view status) {
  const auto parsed = parseJson(status);
  const auto* object = parsed ? parsed->if_object() : nullptr;
  const auto* bag = object ? objectIn(*object, "bag") : nullptr;
  if (!bag || boolIn(*bag, "enabled")) return std::nullopt;
  return *bag;
}

std::string bagFetchText(const json::object& bag, double now) {
  const auto* failure = objectIn(bag, "last_failure");
  const auto next = numberIn(bag, "next_attempt");
  auto text = "fetching " + printable(stringIn(bag, "url").value_or("it"));
  text += failure ? failureText(*failure, now) : " has not come to an end";
  if (next && *next > now) text += "; next attempt in " + spanText(*next - now);
  if (next && *next <= now) text += "; the next query tries again";
  return text;
}

}  // namespace zelkorctl
