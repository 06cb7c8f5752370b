#include "zelkorctl/Options.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <initializer_list>
#include <limits>

namespace zelkorctl {
namespace {

// What is wrong with a value; empty when nothing is.
using Problem = std::string;

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

Problem readMilliseconds(Duration& target, const std::string& text, std::int64_t most) {
  std::int64_t milliseconds = 0;
  auto problem = readCount(milliseconds, text, 0, most);
  if (problem.empty()) target = std::chrono::milliseconds(milliseconds);
  return problem;
}

constexpr std::array kSelections{
    std::pair{std::string_view("default"), std::uint32_t{0}},
    std::pair{std::string_view("explicit"), std::uint32_t{1}},
    std::pair{std::string_view("hint"), std::uint32_t{2}},
};

// One of the table's names.
template <typename Value, std::size_t size>
Problem readNamed(Value& target, const std::string& text,
                  const std::array<std::pair<std::string_view, Value>, size>& table) {
  std::string names;
  for (const auto& [name, value] : table) {
    if (name == text) {
      target = value;
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

Problem readTexts(std::vector<std::string>& target, const std::string& text) {
  if (text.empty()) return "a text";
  target.push_back(text);
  return {};
}

Problem setFlag(bool& target) {
  target = true;
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
    if (rule.commands != kEvery) special_.push_back(&rule);
  }

  void checkOptions() {
    const auto own = command_ ? setOf({command_->command}) : CommandSet{0};
    for (const auto* rule : special_) {
      if ((rule->commands & own) != 0) continue;
      problem_ = std::string(rule->name) + " is for other commands";
    }
    if (!options_.address.empty() && !options_.socket.empty()) {
      problem_ = "--address and --socket exclude each other";
    }
  }

  void checkArguments() {
    if (!command_) {
      problem_ = "no command given";
      return;
    }
    const auto count = options_.arguments.size();
    if (options_.command == Command::Defaults) {
      checkDefaults();
    } else if (options_.command == Command::Help) {
      if (count > 1) problem_ = "help takes one command";
    } else if (options_.command == Command::Report) {
      if (count < 1 || count > 2) problem_ = "report takes a class and its fields as JSON";
    } else if (options_.command == Command::Containers) {
      if (count > 1) problem_ = "containers takes one number";
    } else if (takesText()) {
      if (count == 0 && needsText()) problem_ = std::string(command_->name) + " needs a text";
    } else if (count > 0) {
      problem_ = std::string(command_->name) + " takes no arguments";
    }
  }

  bool takesText() const {
    constexpr auto kTakers =
        setOf({Command::Search, Command::More, Command::Card, Command::Lookup, Command::Images});
    return (kTakers & setOf({options_.command})) != 0;
  }

  // Something that the query is made from is there already.
  bool needsText() const {
    return options_.kind != QueryKind::ZeroKeyword && options_.urls.empty() &&
           options_.identifiers.empty();
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
