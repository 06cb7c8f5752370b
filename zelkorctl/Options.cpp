#include "zelkorctl/Options.h"

#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>
#include <algorithm>
#include <array>
#include <initializer_list>
#include <limits>

#include "base/CommandLineWords.h"
#include "zelkorctl/OptionValues.h"

namespace zelkorctl {
namespace {

// Commands as bits.
using CommandSet = std::uint32_t;

constexpr CommandSet setOf(std::initializer_list<Command> commands) {
  CommandSet set = 0;
  for (const auto command : commands) set |= CommandSet{1} << static_cast<unsigned>(command);
  return set;
}

constexpr CommandSet kEvery = ~CommandSet{0};
constexpr CommandSet kQueries = setOf({Command::Search, Command::Type, Command::More, Command::Card,
                                       Command::Lookup, Command::ZeroKeyword, Command::Images});
constexpr CommandSet kLists =
    setOf({Command::Search, Command::Type, Command::More, Command::Lookup, Command::ZeroKeyword});

struct OptionRule {
  std::string_view name;
  CommandSet commands;  // that take it
  bool takesValue;
  Problem (*apply)(Options&, const std::string& value);
};

struct CommandRule {
  std::string_view name;
  Command command;
};

constexpr std::array kCommands{
    CommandRule{"search", Command::Search},
    CommandRule{"type", Command::Type},
    CommandRule{"more", Command::More},
    CommandRule{"card", Command::Card},
    CommandRule{"lookup", Command::Lookup},
    CommandRule{"zkw", Command::ZeroKeyword},
    CommandRule{"images", Command::Images},
    CommandRule{"bag", Command::Bag},
    CommandRule{"defaults", Command::Defaults},
    CommandRule{"sessions", Command::Sessions},
    CommandRule{"feedback", Command::Feedback},
    CommandRule{"report", Command::Report},
    CommandRule{"containers", Command::Containers},
    CommandRule{"metrics", Command::Metrics},
    CommandRule{"status", Command::Status},
    CommandRule{"version", Command::Version},
    CommandRule{"help", Command::Help},
};

constexpr std::array kKinds{
    std::pair{std::string_view("search"), QueryKind::Search},
    std::pair{std::string_view("zeroKeyword"), QueryKind::ZeroKeyword},
    std::pair{std::string_view("moreResults"), QueryKind::MoreResults},
    std::pair{std::string_view("card"), QueryKind::Card},
    std::pair{std::string_view("lookup"), QueryKind::Lookup},
    std::pair{std::string_view("flightLookup"), QueryKind::FlightLookup},
    std::pair{std::string_view("flightSearch"), QueryKind::FlightSearch},
};

constexpr std::array kSelections{
    std::pair{std::string_view("default"), std::uint32_t{0}},
    std::pair{std::string_view("explicit"), std::uint32_t{1}},
    std::pair{std::string_view("hint"), std::uint32_t{2}},
};

Problem readItem(Options& options, const std::string& text) {
  const auto equals = text.find('=');
  if (equals == 0 || equals == std::string::npos) return "NAME=VALUE";
  options.items.emplace_back(text.substr(0, equals), text.substr(equals + 1));
  return {};
}

// One line each: the table is the reference of all options.
const std::array kOptions{
    OptionRule{"--help", kEvery, false,
               [](Options& o, const std::string&) { return setFlag(o.help); }},
    OptionRule{"--json", kEvery, false,
               [](Options& o, const std::string&) { return setFlag(o.json); }},
    OptionRule{"--verbose", kEvery, false,
               [](Options& o, const std::string&) { return setFlag(o.verbose); }},
    OptionRule{"--client", kEvery, true,
               [](Options& o, const std::string& v) { return readText(o.client, v); }},
    OptionRule{"--user-agent", kEvery, true,
               [](Options& o, const std::string& v) { return readText(o.userAgent, v); }},
    OptionRule{"--address", kEvery, true,
               [](Options& o, const std::string& v) { return readText(o.address, v); }},
    OptionRule{"--socket", kEvery, true,
               [](Options& o, const std::string& v) { return readText(o.socket, v); }},
    OptionRule{"--timeout", kEvery, true,
               [](Options& o, const std::string& v) { return readSeconds(o.timeout, v); }},
    OptionRule{"--kind", setOf({Command::Search}), true,
               [](Options& o, const std::string& v) { return readNamed(o.kind, v, kKinds); }},
    OptionRule{"--item", kQueries, true,
               [](Options& o, const std::string& v) { return readItem(o, v); }},
    OptionRule{"--url", setOf({Command::Search, Command::More, Command::Card, Command::Images}),
               true, [](Options& o, const std::string& v) { return readTexts(o.urls, v); }},
    OptionRule{"--count", setOf({Command::Search}), true,
               [](Options& o, const std::string& v) { return readCount(o.count, v, 1, 100'000); }},
    OptionRule{"--limit", kLists, true,
               [](Options& o, const std::string& v) { return readCount(o.limit, v, 0, 1'000); }},
    OptionRule{"--as-typed", setOf({Command::Search}), false,
               [](Options& o, const std::string&) { return setFlag(o.asTyped); }},
    OptionRule{"--delay-per-key", setOf({Command::Search, Command::Type}), true,
               [](Options& o, const std::string& v) {
                 return readMilliseconds(o.delayPerKey, v, 60'000);
               }},
    OptionRule{"--endpoint", setOf({Command::More, Command::Card}), false,
               [](Options& o, const std::string&) { return setFlag(o.endpoint); }},
    OptionRule{"--pages", setOf({Command::More}), true,
               [](Options& o, const std::string& v) { return readCount(o.pages, v, 1, 1'000); }},
    OptionRule{"--result", setOf({Command::Card}), true,
               [](Options& o, const std::string& v) { return readCount(o.result, v, 1, 1'000); }},
    OptionRule{"--context", setOf({Command::Lookup}), true,
               [](Options& o, const std::string& v) { return readText(o.context.emplace(), v); }},
    OptionRule{"--selection", setOf({Command::Lookup}), true,
               [](Options& o, const std::string& v) {
                 return readNamed(o.selectionType, v, kSelections);
               }},
    OptionRule{"--app", setOf({Command::Lookup}), true,
               [](Options& o, const std::string& v) { return readText(o.appBundleId, v); }},
    OptionRule{"--hint-domain", setOf({Command::Lookup}), true,
               [](Options& o, const std::string& v) { return readText(o.hintDomain, v); }},
    OptionRule{"--id", setOf({Command::Images}), true,
               [](Options& o, const std::string& v) { return readTexts(o.identifiers, v); }},
    OptionRule{"--save", setOf({Command::Images}), true,
               [](Options& o, const std::string& v) { return readText(o.folder, v); }},
    OptionRule{
        "--deadline", setOf({Command::Images}), true,
        [](Options& o, const std::string& v) { return readMilliseconds(o.deadline, v, 600'000); }},
    OptionRule{"--event", setOf({Command::Report}), true,
               [](Options& o, const std::string& v) { return readText(o.event, v); }},
    OptionRule{"--query-id", setOf({Command::Report}), true,
               [](Options& o, const std::string& v) {
                 using Limits = std::numeric_limits<std::int64_t>;
                 return readCount(o.queryId, v, Limits::min(), Limits::max());
               }},
    OptionRule{"--domain", setOf({Command::Defaults}), true,
               [](Options& o, const std::string& v) { return readText(o.domain, v); }},
};

const CommandRule* findCommand(std::string_view name) {
  const auto* found = std::find_if(kCommands.begin(), kCommands.end(),
                                   [&](const auto& rule) { return rule.name == name; });
  return found == kCommands.end() ? nullptr : found;
}

// The tables above as the parser knows them. Options of every command are the program's; the others
// and the words belong to the commands.
class ToolParser {
 public:
  ToolParser() {
    app_.set_help_flag();
    app_.require_subcommand(0, 1);
    app_.allow_extras();  // named here, with what is wrong about them
    for (const auto& rule : kOptions) {
      if (rule.commands == kEvery) _add(app_, rule);
    }
    app_.add_flag_callback("--version", [this] { showsVersion_ = true; })->disable_flag_override();
    for (const auto& rule : kCommands) _addCommand(rule);
  }

  std::variant<Options, UsageError> parse(std::vector<std::string> words) {
    std::reverse(words.begin(), words.end());  // as the parser takes them
    try {
      app_.parse(std::move(words));
    } catch (const CLI::ParseError& problem) {
      return UsageError{problem.what()};
    }
    auto problem = _takeCommand();
    if (problem.empty()) problem = _problemWithOptions();
    if (problem.empty() && !options_.help) problem = _problemWithArguments();
    if (!problem.empty()) return UsageError{std::move(problem)};
    return options_;
  }

 private:
  void _addCommand(const CommandRule& rule) {
    auto& command = *app_.add_subcommand(std::string(rule.name))->fallthrough();
    command.set_help_flag();
    for (const auto& option : kOptions) {
      if (option.commands != kEvery && (option.commands & setOf({rule.command})) != 0) {
        _add(command, option);
      }
    }
    // All words, each as it is: a list's "[a,b]" would be taken apart.
    constexpr int kMany = 1 << 20;
    command.add_option("words")->expected(kMany)->allow_extra_args(false)->multi_option_policy(
        CLI::MultiOptionPolicy::TakeAll);
  }

  void _add(CLI::App& app, const OptionRule& rule) {
    const auto name = std::string(rule.name);
    const auto names = name == "--help" ? "-h,--help" : name;
    if (!rule.takesValue) {
      app.add_flag_callback(names, [this, &rule] { rule.apply(options_, {}); })
          ->disable_flag_override();
      return;
    }
    const auto apply = [this, name, &rule](const CLI::results_t& values) {
      for (const auto& value : values) {
        const auto wanted = rule.apply(options_, value);
        if (!wanted.empty()) throw CLI::ValidationError(name + " takes " + wanted);
      }
      return true;
    };
    // The last one counts, or all of them: the rule knows.
    app.add_option(names, apply)
        ->type_name("value")
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
  }

  Problem _takeCommand() {
    const auto parsed = app_.get_subcommands();
    command_ = parsed.empty() ? nullptr : findCommand(parsed.front()->get_name());
    if (command_) {
      options_.command = command_->command;
      options_.arguments = parsed.front()->get_option("words")->results();
    }
    if (showsVersion_ && !options_.help) options_.command = Command::Version;
    for (const auto& extra : app_.remaining()) {
      if (extra != "--") return _problemWith(extra);
    }
    return {};
  }

  Problem _problemWith(const std::string& extra) const {
    if (!command_ && !extra.starts_with('-')) return "no command '" + extra + "'";
    const auto name = extra.substr(0, extra.find('='));
    const bool known = std::any_of(kOptions.begin(), kOptions.end(),
                                   [&](const auto& rule) { return rule.name == name; });
    return known ? name + " is for other commands" : "no option '" + name + "'";
  }

  Problem _problemWithOptions() const {
    if (options_.address.empty() || options_.socket.empty()) return {};
    return "--address and --socket exclude each other";
  }

  Problem _problemWithArguments() const {
    if (!command_) return showsVersion_ ? Problem() : "no command given";
    const auto count = options_.arguments.size();
    const auto name = std::string(command_->name);
    switch (command_->command) {
      case Command::Defaults:
        return _problemWithSettings();
      case Command::Help:
        return count > 1 ? "help takes one command" : Problem();
      case Command::Report:
        return count < 1 || count > 2 ? "report takes a class and its fields as JSON" : Problem();
      case Command::Containers:
        return count > 1 ? "containers takes one number" : Problem();
      default:
        break;
    }
    if (!_takesText()) return count > 0 ? name + " takes no arguments" : Problem();
    return count == 0 && _needsText() ? name + " needs a text" : Problem();
  }

  bool _takesText() const {
    constexpr auto kTakers =
        setOf({Command::Search, Command::More, Command::Card, Command::Lookup, Command::Images});
    return (kTakers & setOf({command_->command})) != 0;
  }

  // Something that the query is made from is there already.
  bool _needsText() const {
    return options_.kind != QueryKind::ZeroKeyword && options_.urls.empty() &&
           options_.identifiers.empty();
  }

  Problem _problemWithSettings() const {
    static constexpr std::array<std::pair<std::string_view, std::size_t>, 4> kActions{
        {{"read", 2}, {"write", 3}, {"delete", 2}, {"list", 1}}};
    const auto& words = options_.arguments;
    const bool fits = std::any_of(kActions.begin(), kActions.end(), [&](const auto& action) {
      return words.size() == action.second && words.front() == action.first;
    });
    return fits ? Problem() : "defaults takes read KEY, write KEY JSON, delete KEY or list";
  }

  CLI::App app_;
  Options options_;
  bool showsVersion_ = false;
  const CommandRule* command_ = nullptr;
};

}  // namespace

std::variant<Options, UsageError> parseArguments(const std::vector<std::string>& arguments) {
  const auto words = withSeparateEmptyValues(arguments);
  // The parser ends a command there, and would search for the words before it.
  const auto end = std::find(words.begin(), words.end(), "--");
  if (std::find(words.begin(), end, "++") != end) return UsageError{"++ stands behind --"};
  return ToolParser().parse(words);
}

std::vector<std::string_view> optionsOf(Command command) {
  std::vector<std::string_view> names;
  for (const auto& rule : kOptions) {
    if ((rule.commands & setOf({command})) != 0) names.push_back(rule.name);
  }
  return names;
}

std::vector<std::pair<std::string_view, Command>> allCommands() {
  std::vector<std::pair<std::string_view, Command>> commands;
  for (const auto& rule : kCommands) commands.emplace_back(rule.name, rule.command);
  return commands;
}

std::optional<Command> commandNamed(std::string_view name) {
  const auto* rule = findCommand(name);
  return rule ? std::optional(rule->command) : std::nullopt;
}

std::string urlOf(const Options& options) {
  return options.urls.empty() ? std::string() : options.urls.back();
}

ClientOptions clientOptions(const Options& options) {
  ClientOptions result;
  result.configuration = {options.client, options.userAgent};
  result.address = options.address;
  result.socketPath = options.socket;
  result.timeout = options.timeout;
  return result;
}

}  // namespace zelkorctl
