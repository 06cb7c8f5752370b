#include "platform/linux/tagger/LinuxTagger.h"

#include <cld2/public/compact_lang_det.h>
#include <cld2/public/encodings.h>

#include <algorithm>
#include <string_view>

#include "base/Text.h"
#include "platform/linux/locale_text/LocaleText.h"

namespace zelkord {
namespace {

// What follows cannot change the language of the start.
constexpr std::size_t kExaminedBytes = 1024;
// How much of the start is tried, the fewest first. Where words have no spaces between them, and
// for long ones, bytes count.
constexpr std::size_t kWordsTried[] = {4, 8, 16, 32, 64};
constexpr std::size_t kBytesOfAWord = 12;

std::string_view firstBytes(std::string_view text, std::size_t count) {
  if (text.size() <= count) return text;
  std::size_t end = count;
  while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0) == 0x80) --end;
  return text.substr(0, end);
}

std::string_view firstWords(std::string_view text, std::size_t count) {
  constexpr std::string_view kSpaces = " \t\r\n";
  std::size_t end = 0;
  for (std::size_t words = 0; words < count && end < text.size(); ++words) {
    const auto begin = text.find_first_not_of(kSpaces, end);
    if (begin == std::string_view::npos) return text;
    end = std::min(text.find_first_of(kSpaces, begin), text.size());
  }
  return firstBytes(text.substr(0, end), count * kBytesOfAWord);
}

// Unknown unless it is reliable. Doubtful words are taken as of the language `hint`.
CLD2::Language languageOf(std::string_view text, CLD2::Language hint) {
  const CLD2::CLDHints hints{nullptr, nullptr, CLD2::UNKNOWN_ENCODING, hint};
  CLD2::Language best[3];
  int percent[3];
  double score[3];
  int textBytes = 0;
  bool reliable = false;
  CLD2::ExtDetectLanguageSummary(text.data(), static_cast<int>(text.size()), true, &hints, 0, best,
                                 percent, score, nullptr, &textBytes, &reliable);
  return reliable ? best[0] : CLD2::UNKNOWN_LANGUAGE;
}

// Of the fewest words that tell it.
CLD2::Language languageAtStartOf(std::string_view text) {
  const auto ofAll = languageOf(text, CLD2::UNKNOWN_LANGUAGE);
  for (const auto count : kWordsTried) {
    const auto start = firstWords(text, count);
    if (start.size() == text.size()) break;
    const auto language = languageOf(start, ofAll);
    if (language != CLD2::UNKNOWN_LANGUAGE) return language;
  }
  return ofAll;
}

}  // namespace

std::string LinuxTagger::languageAtStart(const std::string& text) const {
  const auto start = firstBytes(text, kExaminedBytes);
  if (start.empty() || !isValidUtf8(start)) return "und";
  const auto language = languageAtStartOf(start);
  if (language == CLD2::UNKNOWN_LANGUAGE) return "und";
  const std::string_view code = CLD2::LanguageCode(language);
  if (code == "un" || code.starts_with("xxx")) return "und";
  return languageTagOf(std::string(code)).value_or("und");
}

}  // namespace zelkord
