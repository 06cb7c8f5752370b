#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <string_view>

#include "base/Namespace.h"

namespace zelkord {

// What Cache-Control headers say (RFC 9111, 5.2), as far as it matters to a private cache that
// never answers with what is stale: "private", "must-revalidate" and "s-maxage" do not.
//
// What cannot be read counts as what keeps least: a damaged list as "no-store", a damaged number,
// or two that differ, as the one that makes a response stale.
struct CacheDirectives {
  static constexpr std::chrono::seconds kMaximum{std::int64_t{1} << 31};

  bool noStore = false;
  bool noCache = false;  // with field names too
  bool mustUnderstand = false;
  std::optional<std::chrono::seconds> maxAge;
  std::chrono::seconds minFresh{0};
};

// `header` has the values of all Cache-Control headers, joined by commas.
CacheDirectives parseCacheDirectives(std::string_view header);

// A number of seconds as headers write it, at most kMaximum; none for anything but digits.
std::optional<std::chrono::seconds> parseDeltaSeconds(std::string_view text);

// Cuts the first element, without the white space around it, off a list with commas; those in
// quoted strings do not count. None when a quoted string has no end; nothing remains then.
std::optional<std::string_view> takeListElement(std::string_view& rest);

std::string_view withoutWhiteSpaceAround(std::string_view text);
std::string lowerCasedASCII(std::string_view text);

}  // namespace zelkord
