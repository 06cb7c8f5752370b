#include "zelkord/network/context/DebugParameters.h"

#include <algorithm>

namespace zelkord {

DebugParameters parseDebugParameters(std::string_view text) {
  DebugParameters parameters;
  bool more = !text.empty();
  while (more) {
    const auto end = text.find('&');
    const auto piece = text.substr(0, end);
    if (std::count(piece.begin(), piece.end(), '=') != 1) {
      return {{}, std::string(piece), false};
    }
    const auto equals = piece.find('=');
    parameters.items.emplace_back(piece.substr(0, equals), piece.substr(equals + 1));
    more = end != std::string_view::npos;
    if (more) text.remove_prefix(end + 1);
  }
  return parameters;
}

}  // namespace zelkord
