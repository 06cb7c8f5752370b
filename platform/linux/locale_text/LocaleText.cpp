#include "platform/linux/locale_text/LocaleText.h"

#include <unicode/bytestream.h>
#include <unicode/locid.h>
#include <unicode/timezone.h>

#include <algorithm>
#include <memory>

namespace zelkord {
namespace {

constexpr std::size_t kMaximumLocaleText = 100;

// "de_DE.UTF-8@euro" to "de_DE"; extensions of a tag ("de-DE-u-ca-buddhist") and keywords of an
// identifier
// ("th_TH@calendar=gregorian") stay, since they mean something to ICU.
std::string withoutCharset(std::string text) {
  const auto modifier = text.find('@');
  if (modifier != std::string::npos && text.find('=', modifier) == std::string::npos) {
    text.erase(modifier);
  }
  const auto charset = text.find('.');
  if (charset != std::string::npos) {
    const auto end = std::min(text.find('@', charset), text.size());
    text.erase(charset, end - charset);
  }
  return text;
}

bool hasOnlyLocaleCharacters(const std::string& text) {
  constexpr std::string_view kOther = "_-@=;+/.";
  return std::all_of(text.begin(), text.end(), [&](char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
           kOther.find(c) != std::string_view::npos;
  });
}

std::optional<icu::Locale> parsedLocale(const std::string& raw) {
  if (raw.empty() || raw.size() > kMaximumLocaleText || !hasOnlyLocaleCharacters(raw)) {
    return std::nullopt;
  }
  const auto text = withoutCharset(raw);
  if (text == "C" || text == "POSIX") return std::nullopt;
  UErrorCode status = U_ZERO_ERROR;
  const bool isTag = text.find('-') != std::string::npos && text.find('_') == std::string::npos;
  auto locale = isTag ? icu::Locale::forLanguageTag(text, status)
                      : icu::Locale::createCanonical(text.c_str());
  const std::string_view language = locale.getLanguage();
  if (U_FAILURE(status) || locale.isBogus() || language.size() < 2) return std::nullopt;
  return locale;
}

}  // namespace

std::optional<std::string> localeIdentifierOf(const std::string& text) {
  const auto locale = parsedLocale(text);
  return locale ? std::optional<std::string>(locale->getName()) : std::nullopt;
}

std::optional<std::string> languageTagOf(const std::string& text) {
  const auto locale = parsedLocale(text);
  if (!locale) return std::nullopt;
  UErrorCode status = U_ZERO_ERROR;
  auto tag = locale->toLanguageTag<std::string>(status);
  if (U_FAILURE(status) || tag.empty() || tag == "und") return std::nullopt;
  return tag;
}

std::string regionOfLocale(const std::string& identifier) {
  icu::Locale locale(identifier.c_str());
  if (*locale.getCountry() == '\0') {
    UErrorCode status = U_ZERO_ERROR;
    locale.addLikelySubtags(status);
  }
  return locale.getCountry();
}

bool isKnownTimeZone(const std::string& name) {
  if (name.empty() || name.size() > kMaximumLocaleText || name == "Etc/Unknown") return false;
  const std::unique_ptr<icu::TimeZone> zone(
      icu::TimeZone::createTimeZone(icu::UnicodeString::fromUTF8(name)));
  return zone && *zone != icu::TimeZone::getUnknown();
}

}  // namespace zelkord
