#include "platform/linux/tagger/LinuxTagger.h"

#include <cld2/public/compact_lang_det.h>
#include <cld2/public/encodings.h>

#include <string_view>

#include "base/Text.h"
#include "platform/linux/locale/LocaleText.h"

namespace zelkord {
namespace {

// What follows cannot change the language of the start.
constexpr std::size_t kExaminedBytes = 1024;

std::string_view startOf(std::string_view text) {
  if (text.size() <= kExaminedBytes) return text;
  std::size_t end = kExaminedBytes;
  while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0) == 0x80) --end;
  return text.substr(0, end);
}

}  // namespace

std::string LinuxTagger::languageAtStart(const std::string& text) const {
  const auto start = startOf(text);
  if (start.empty() || !isValidUtf8(start)) return "und";
  bool reliable = false;
  const auto language =
      CLD2::DetectLanguage(start.data(), static_cast<int>(start.size()), true, &reliable);
  if (!reliable || language == CLD2::UNKNOWN_LANGUAGE) return "und";
  const std::string_view code = CLD2::LanguageCode(language);
  if (code == "un" || code.starts_with("xxx")) return "und";
  return languageTagOf(std::string(code)).value_or("und");
}

}  // namespace zelkord
