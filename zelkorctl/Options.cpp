#include "zelkorctl/Options.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>

namespace zelkorctl {
namespace {

// What is wrong with a value; empty when nothing is.
using Problem = std::string;

enum class Group { Every, Query, Settings };

struct OptionRule {
  std::string_view name;
  Group group;
  bool takesValue;
  Problem (*apply)(Options&, const std::string& value);
};

struct CommandRule {
  std::string_view name;
  Command command;
  Group group;  // whose options it takes, besides everybody's
};

constexpr std::array kCommands{
    CommandRule{"search", Command::Search, Group::Query},
    CommandRule{"type", Command::Type, Group::Query},
    CommandRule{"bag", Command::Bag, Group::Every},
    CommandRule{"defaults", Command::Defaults, Group::Settings},
    CommandRule{"sessions", Command::Sessions, Group::Every},
    CommandRule{"metrics", Command::Metrics, Group::Every},
    CommandRule{"status", Command::Status, Group::Every},
    CommandRule{"version", Command::Version, Group::Every},
    CommandRule{"help", Command::Help, Group::Every},
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

Problem readCount(std::int64_t& target, const std::string& text, std::int64_t least,
                  std::int64_t most) {
  std::int64_t value = 0;
  const auto* end = text.data() + text.size();
  const auto [stop, code] = std::from_chars(text.data(), end, value);
  if (code != std::errc() || stop != end || value < least || value > most) {
    return "a number from " + std::to_string(least) + " to " + std::to_string(most);
  }
  target = value;
  return {};
}

Problem readSeconds(Duration& target, const std::string& text) {
  double value = 0;
  const auto* end = text.data() + text.size();
  const auto [stop, code] = std::from_chars(text.data(), end, value);
  if (code != std::errc() || stop != end || !(value > 0) || value > 86400) {
    return "seconds, above 0 and up to 86400";
  }
  target = durationOfSeconds(value);
  return {};
}

Problem readDelay(Duration& target, const std::string& text) {
  std::int64_t milliseconds = 0;
  auto problem = readCount(milliseconds, text, 0, 60'000);
  if (problem.empty()) target = std::chrono::milliseconds(milliseconds);
  return problem;
}

Problem readKind(QueryKind& target, const std::string& text) {
  std::string names;
  for (const auto& [name, kind] : kKinds) {
    if (name == text) {
      target = kind;
      return {};
    }
    names += (names.empty() ? "one of " : ", ") + std::string(name);
  }
  return names;
}

Problem readItem(Options& options, const std::string& text) {
  const auto equals = text.find('=');
  if (equals == 0 || equals == std::string::npos) return "NAME=VALUE";
  options.items.emplace_back(text.substr(0, equals), text.substr(equals + 1));
  return {};
}

Problem readText(std::string& target, const std::string& text) {
  target = text;
  return {};
}

Problem setFlag(bool& target) {
  target = true;
  return {};
}

// One line each: the table is the reference of all options.
const std::array kOptions{
    OptionRule{"--help", Group::Every, false,
               [](Options& o, const std::string&) { return setFlag(o.help); }},
    OptionRule{"--json", Group::Every, false,
               [](Options& o, const std::string&) { return setFlag(o.json); }},
    OptionRule{"--verbose", Group::Every, false,
               [](Options& o, const std::string&) { return setFlag(o.verbose); }},
    OptionRule{"--client", Group::Every, true,
               [](Options& o, const std::string& v) { return readText(o.client, v); }},
    OptionRule{"--user-agent", Group::Every, true,
               [](Options& o, const std::string& v) { return readText(o.userAgent, v); }},
    OptionRule{"--address", Group::Every, true,
               [](Options& o, const std::string& v) { return readText(o.address, v); }},
    OptionRule{"--socket", Group::Every, true,
               [](Options& o, const std::string& v) { return readText(o.socket, v); }},
    OptionRule{"--timeout", Group::Every, true,
               [](Options& o, const std::string& v) { return readSeconds(o.timeout, v); }},
    OptionRule{"--kind", Group::Query, true,
               [](Options& o, const std::string& v) { return readKind(o.kind, v); }},
    OptionRule{"--item", Group::Query, true,
               [](Options& o, const std::string& v) { return readItem(o, v); }},
    OptionRule{"--url", Group::Query, true,
               [](Options& o, const std::string& v) { return readText(o.url, v); }},
    OptionRule{"--count", Group::Query, true,
               [](Options& o, const std::string& v) { return readCount(o.count, v, 1, 100'000); }},
    OptionRule{"--limit", Group::Query, true,
               [](Options& o, const std::string& v) { return readCount(o.limit, v, 0, 1'000); }},
    OptionRule{"--as-typed", Group::Query, false,
               [](Options& o, const std::string&) { return setFlag(o.asTyped); }},
    OptionRule{"--delay-per-key", Group::Query, true,
               [](Options& o, const std::string& v) { return readDelay(o.delayPerKey, v); }},
    OptionRule{"--domain", Group::Settings, true,
               [](Options& o, const std::string& v) { return readText(o.domain, v); }},
};

const CommandRule* findCommand(std::string_view name) {
  const auto* found = std::find_if(kCommands.begin(), kCommands.end(),
                                   [&](const auto& rule) { return rule.name == name; });
  return found == kCommands.end() ? nullptr : found;
}

// One pass over the command line.
class Parsing {
 public:
  explicit Parsing(const std::vector<std::string>& words) : words_(words) {}

  std::variant<Options, UsageError> result() {
    while (next_ < words_.size() && problem_.empty()) takeWord(words_[next_++]);
    if (problem_.empty()) checkOptions();
    if (problem_.empty() && !options_.help) checkArguments();
    if (!problem_.empty()) return UsageError{problem_};
    return options_;
  }

 private:
  void takeWord(const std::string& word) {
    if (onlyArguments_ || word == "-" || word.empty() || word.front() != '-') {
      takeArgument(word);
    } else if (word == "--") {
      onlyArguments_ = true;
    } else {
      takeOption(word == "-h" ? "--help" : word);
    }
  }

  void takeArgument(const std::string& word) {
    if (command_) {
      options_.arguments.push_back(word);
      return;
    }
    command_ = findCommand(word);
    if (command_) {
      options_.command = command_->command;
    } else {
      problem_ = "no command '" + word + "'";
    }
  }

  void takeOption(const std::string& word) {
    const auto equals = word.find('=');
    const auto name = word.substr(0, equals);
    const auto* rule = std::find_if(kOptions.begin(), kOptions.end(),
                                    [&](const auto& option) { return option.name == name; });
    if (rule == kOptions.end()) {
      problem_ = "no option '" + name + "'";
    } else if (!rule->takesValue) {
      if (equals != std::string::npos) problem_ = name + " takes no value";
      if (problem_.empty()) apply(*rule, {});
    } else if (equals != std::string::npos) {
      apply(*rule, word.substr(equals + 1));
    } else if (next_ < words_.size()) {
      apply(*rule, words_[next_++]);
    } else {
      problem_ = name + " needs a value";
    }
  }

  void apply(const OptionRule& rule, const std::string& value) {
    const auto wanted = rule.apply(options_, value);
    if (!wanted.empty()) problem_ = std::string(rule.name) + " takes " + wanted;
    if (rule.group != Group::Every) special_.push_back(&rule);
  }

  void checkOptions() {
    const auto group = command_ ? command_->group : Group::Every;
    for (const auto* rule : special_) {
      if (rule->group == group) continue;
      problem_ = std::string(rule->name) + " is for other commands";
    }
    if (!options_.address.empty() && !options_.socket.empty()) {
      problem_ = "--address and --socket exclude each other";
    }
  }

  void checkArguments() {
    const auto count = options_.arguments.size();
    if (!command_) {
      problem_ = "no command given";
    } else if (options_.command == Command::Search) {
      const bool needsText = options_.kind != QueryKind::ZeroKeyword && options_.url.empty();
      if (count == 0 && needsText) problem_ = "search needs a text";
    } else if (options_.command == Command::Defaults) {
      checkDefaults();
    } else if (options_.command == Command::Help) {
      if (count > 1) problem_ = "help takes one command";
    } else if (count > 0) {
      problem_ = std::string(command_->name) + " takes no arguments";
    }
  }

  void checkDefaults() {
    static constexpr std::array<std::pair<std::string_view, std::size_t>, 4> kActions{
        {{"read", 2}, {"write", 3}, {"delete", 2}, {"list", 1}}};
    const auto& words = options_.arguments;
    const bool fits = std::any_of(kActions.begin(), kActions.end(), [&](const auto& action) {
      return words.size() == action.second && words.front() == action.first;
    });
    if (!fits) problem_ = "defaults takes read KEY, write KEY JSON, delete KEY or list";
  }

  const std::vector<std::string>& words_;
  std::size_t next_ = 0;
  Options options_;
  const CommandRule* command_ = nullptr;
  std::vector<const OptionRule*> special_;
  bool onlyArguments_ = false;
  Problem problem_;
};

}  // namespace

std::variant<Options, UsageError> parseArguments(const std::vector<std::string>& arguments) {
  return Parsing(arguments).result();
}

std::optional<Command> commandNamed(std::string_view name) {
  const auto* rule = findCommand(name);
  return rule ? std::optional(rule->command) : std::nullopt;
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
