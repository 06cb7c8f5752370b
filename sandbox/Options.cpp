#include "sandbox/Options.h"

#include <charconv>
#include <optional>
#include <string_view>

namespace sandbox {

namespace {

template <typename Number>
std::optional<Number> parseNumber(std::string_view text) {
  Number number{};
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return number;
}

template <typename Number>
bool assignNumber(Number& target, std::string_view text) {
  const auto number = parseNumber<Number>(text);
  if (number) target = *number;
  return number.has_value();
}

// False when the value is no good for this option.
bool applyOption(Options& options, std::string_view name, std::string_view value) {
  if (name == "--port") return assignNumber(options.port, value);
  if (name == "--threads") return assignNumber(options.threads, value);
  if (name == "--state") options.state = value;
  if (name == "--port-file") options.portFile = value;
  if (name == "--data-from") options.dataRoot = value;
  return !value.empty();
}

bool takesValue(std::string_view name) {
  return name == "--state" || name == "--port" || name == "--port-file" || name == "--data-from" ||
         name == "--threads";
}

}  // namespace

Outcome<Options> parseOptions(std::span<const char* const> arguments) {
  Options options;
  for (std::size_t at = 0; at < arguments.size(); ++at) {
    const std::string name = arguments[at];
    if (name == "--help") {
      options.help = true;
    } else if (name == "--quiet") {
      options.quiet = true;
    } else if (name == "--background") {
      options.background = true;
    } else if (!takesValue(name)) {
      return Failure{"unknown argument " + name};
    } else if (++at == arguments.size()) {
      return Failure{name + " needs a value"};
    } else if (!applyOption(options, name, arguments[at])) {
      return Failure{"bad value of " + name + ": " + arguments[at]};
    }
  }
  if (options.state.empty() && !options.help) return Failure{"--state is needed"};
  return options;
}

std::string usage() {
  return R"(usage: zelkor-sandbox --state DIR [--port N] [--port-file PATH] [--data-from DIR] [--threads N]
                      [--background] [--quiet] [--help]

A complete suggestion service for this machine, on https://localhost:PORT.

  --state DIR       keeps the certificate, the index, the request log and the uploads in DIR
  --port N          listens on port N; 0, the default, takes any free one
  --port-file PATH  writes the service's URL to PATH once it is serving
  --data-from DIR   looks for wordnet/, iso-codes/json/, unicode/ and flags/ below DIR instead of /usr/share
  --threads N       serves on N threads instead of one a processor
  --background      returns once it is serving, and serves on by itself
  --quiet           says nothing on standard output
)";
}

}  // namespace sandbox
