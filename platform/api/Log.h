#pragma once

#include <fmt/format.h>

#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "base/Namespace.h"

namespace zelkord {

// In ascending order; `Fault` is printed at every level.
enum class LogLevel { Debug, Info, Default, Error, Fault };

// Where log entries go.
// Threading: any thread.
class LogSink {
 public:
  virtual ~LogSink() = default;
  virtual bool isEnabled(LogLevel level) const = 0;
  // The setting "ZLKLogPrivateData".
  virtual bool showsPrivateData() const = 0;
  // `text` may hold line breaks; the sink makes one entry of it.
  virtual void write(LogLevel level, std::string_view category, std::string_view text) = 0;
  // The same, for a sink that tells the places in the code apart: `place` is the address of the
  // format string.
  virtual void writeFrom(const void* place, LogLevel level, std::string_view category,
                         std::string_view text) {
    static_cast<void>(place);
    write(level, category, text);
  }
};

// A text that a person typed, a header dictionary, an identifier of a person: printed as <private>
// unless the setting says otherwise. Borrows the text for the call.
struct Private {
  std::string_view text;
  bool shown = false;
};
inline Private priv(std::string_view text) { return {text}; }

// A log handle: a sink and a category. Copies share the sink, which must outlive them. Formatting
// costs nothing when the level is off.
class Logger {
 public:
  Logger(LogSink& sink, std::string category) : sink_(&sink), category_(std::move(category)) {}

  const std::string& category() const { return category_; }
  bool isEnabled(LogLevel level) const { return sink_->isEnabled(level); }

  template <typename... A>
  void debug(fmt::format_string<const A&...> format, const A&... arguments) const {
    _log(LogLevel::Debug, format, arguments...);
  }
  template <typename... A>
  void info(fmt::format_string<const A&...> format, const A&... arguments) const {
    _log(LogLevel::Info, format, arguments...);
  }
  // The level "default".
  template <typename... A>
  void notice(fmt::format_string<const A&...> format, const A&... arguments) const {
    _log(LogLevel::Default, format, arguments...);
  }
  template <typename... A>
  void error(fmt::format_string<const A&...> format, const A&... arguments) const {
    _log(LogLevel::Error, format, arguments...);
  }
  template <typename... A>
  void fault(fmt::format_string<const A&...> format, const A&... arguments) const {
    _log(LogLevel::Fault, format, arguments...);
  }

 private:
  template <typename... A>
  void _log(LogLevel level, fmt::format_string<const A&...> format, const A&... arguments) const {
    if (!sink_->isEnabled(level)) return;
    [[maybe_unused]] const bool show = sink_->showsPrivateData();
    _writeFormatted(level, format, fmt::make_format_args(_resolve(arguments, show)...));
  }
  template <typename T>
  static const T& _resolve(const T& argument, bool) {
    return argument;
  }
  static Private _resolve(const Private& argument, bool show) { return {argument.text, show}; }
  void _writeFormatted(LogLevel level, fmt::string_view format, fmt::format_args arguments) const;

  LogSink* sink_;
  std::string category_;
};

// The text, or "(null)" for none.
std::string orNull(const std::optional<std::string>& text);

// How a call-back prints.
inline constexpr std::string_view kCallbackText = "(callback)";

}  // namespace zelkord

template <>
struct fmt::formatter<zelkord::Private> : fmt::formatter<fmt::string_view> {
  template <typename Context>
  auto format(const zelkord::Private& value, Context& context) const {
    const auto text = value.shown ? value.text : std::string_view("<private>");
    return fmt::formatter<fmt::string_view>::format(fmt::string_view(text.data(), text.size()),
                                                    context);
  }
};
