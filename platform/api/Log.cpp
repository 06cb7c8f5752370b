#include "platform/api/Log.h"

#include <fmt/format.h>

namespace zelkord {

void Logger::_writeFormatted(LogLevel level, fmt::string_view format,
                             fmt::format_args arguments) const {
  fmt::memory_buffer buffer;
  fmt::vformat_to(std::back_inserter(buffer), format, arguments);
  sink_->writeFrom(format.data(), level, category_, {buffer.data(), buffer.size()});
}

std::string orNull(const std::optional<std::string>& text) { return text ? *text : "(null)"; }

}  // namespace zelkord
