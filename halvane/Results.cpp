#include "halvane/Results.h"

#include <algorithm>

namespace zelkor {
namespace {

bool isSchemeCharacter(char character) {
  return (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z') ||
         (character >= '0' && character <= '9') || character == '+' || character == '-' ||
         character == '.';
}

// RFC 3986, section 4.3: it begins with a scheme, and something follows.
bool isAbsolute(const std::string& url) {
  const auto colon = url.find(':');
  if (colon == std::string::npos || colon == 0 || colon + 1 == url.size()) return false;
  const bool beginsWithLetter = isSchemeCharacter(url[0]) && url[0] != '+' && url[0] != '-' &&
                                url[0] != '.' && (url[0] < '0' || url[0] > '9');
  return beginsWithLetter &&
         std::all_of(url.begin(), url.begin() + static_cast<std::ptrdiff_t>(colon),
                     isSchemeCharacter);
}

}  // namespace

std::optional<std::string> HVPunchout::preferredOpenableURL() const {
  const auto found = std::find_if(urls.begin(), urls.end(), isAbsolute);
  return found == urls.end() ? std::nullopt : std::optional(*found);
}

}  // namespace zelkor
