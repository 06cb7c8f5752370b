#include "sandbox/Options.h"

#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>
#include <algorithm>
#include <charconv>
#include <vector>

namespace sandbox {

namespace {

// A decimal number that fits the target.
template <typename Number>
void addNumber(CLI::App& app, const std::string& name, Number& target, const std::string& what) {
  app.add_option_function<std::string>(
         name,
         [name, &target](const std::string& text) {
           const auto* end = text.data() + text.size();
           const auto [stop, error] = std::from_chars(text.data(), end, target);
           if (error != std::errc() || stop != end) {
             throw CLI::ValidationError("bad value of " + name + ": " + text);
           }
         },
         what)
      ->type_name("N");
}

void addPath(CLI::App& app, const std::string& name, std::filesystem::path& target,
             const std::string& type, const std::string& what) {
  app.add_option_function<std::string>(
         name,
         [name, &target](const std::string& text) {
           if (text.empty()) throw CLI::ValidationError(name + " needs a path");
           target = text;
         },
         what)
      ->type_name(type);
}

void describe(CLI::App& app, Options& options) {
  app.set_help_flag();
  app.option_defaults()->multi_option_policy(CLI::MultiOptionPolicy::TakeLast);
  addPath(app, "--state", options.state, "DIR",
          "Keep the certificate, the index, the request log and the uploads in DIR");
  addNumber(app, "--port", options.port, "Listen on port N; 0, the default, takes any free one");
  addPath(app, "--port-file", options.portFile, "PATH",
          "Write the service's URL to PATH once it is serving");
  addPath(app, "--data-from", options.dataRoot, "DIR",
          "Look for wordnet/, iso-codes/json/, unicode/ and flags/ below DIR, not /usr/share");
  addNumber(app, "--threads", options.threads, "Serve on N threads instead of one a processor");
  app.add_flag("--background", options.background,
               "Return once it is serving, and serve on by itself")
      ->disable_flag_override();
  app.add_flag("--quiet", options.quiet, "Say nothing on standard output")->disable_flag_override();
  app.add_flag("--version", options.version, "Show the version")->disable_flag_override();
  app.add_flag("-h,--help", options.help, "Show this help")->disable_flag_override();
}

}  // namespace

Outcome<Options> parseOptions(std::span<const char* const> arguments) {
  Options options;
  CLI::App app;
  describe(app, options);
  try {
    app.parse(std::vector<std::string>(arguments.rbegin(), arguments.rend()));
  } catch (const CLI::ParseError& problem) {
    return Failure{problem.what()};
  }
  const bool serves = !options.help && !options.version;
  if (serves && options.state.empty()) return Failure{"--state is needed"};
  return options;
}

std::string usage() {
  Options unused;
  CLI::App app("A complete suggestion service for this machine, on https://localhost:PORT.",
               "zelkor-sandbox");
  describe(app, unused);
  return app.help();
}

std::string version() { return "zelkor-sandbox " ZK_VERSION "\n"; }

}  // namespace sandbox
