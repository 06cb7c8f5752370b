#include "zelkord/assembly/ZelkorDiagnosticDataReporter.h"

#include <fmt/core.h>

namespace zelkord {

std::string createAggdKey(std::string_view prefix, std::string_view suffix) {
  return fmt::format("com.quenta.zelkord.{}.{}", prefix, suffix);
}

}  // namespace zelkord
