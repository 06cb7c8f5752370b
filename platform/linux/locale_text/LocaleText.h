#pragma once

#include <optional>
#include <string>

#include "base/Namespace.h"

namespace zelkord {

// The locale identifier ("en_US") of a POSIX locale ("en_US.UTF-8@euro"), a BCP 47 tag or an
// identifier. None for one without a language, "C" and "POSIX" among them.
std::optional<std::string> localeIdentifierOf(const std::string& text);

// The BCP 47 tag of a locale or tag in any of those forms.
std::optional<std::string> languageTagOf(const std::string& text);

// The region of a locale, the likely one when it names none; may be empty.
std::string regionOfLocale(const std::string& identifier);

bool isKnownTimeZone(const std::string& name);

}  // namespace zelkord
