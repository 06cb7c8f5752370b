#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/Json.h"

// Readers of single values of a device profile: none for a value that cannot be used.
namespace zelkord::profile {

// At most 256 bytes without control characters: such texts end up in headers.
std::optional<std::string> plainText(const json::value& value);
std::optional<std::string> nonEmptyText(const json::value& value);
std::optional<bool> flag(const json::value& value);
std::optional<double> numberWithin(const json::value& value, double low, double high);
// A number without a fraction.
std::optional<int> integerWithin(const json::value& value, int low, int high);
// "en_US", also from "en-US".
std::optional<std::string> localeIdentifier(const json::value& value);
// BCP 47 tags, at most 100; none when any is not one.
std::optional<std::vector<std::string>> languageTags(const json::value& value);
// Two letters, made upper case.
std::optional<std::string> countryCode(const json::value& value);
std::optional<std::string> temperatureUnit(const json::value& value);
// A name that the time zone database knows.
std::optional<std::string> timeZone(const json::value& value);
// Base64 with padding and without line breaks, at most 64 KiB.
std::optional<std::string> base64(const json::value& value);

}  // namespace zelkord::profile
