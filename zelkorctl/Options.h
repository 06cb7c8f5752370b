#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "base/Time.h"
#include "corezelkor/client/ClientOptions.h"

namespace zelkorctl {

using namespace zelkor;

enum class Command { Search, Type, Bag, Defaults, Sessions, Metrics, Status, Version, Help };

enum class QueryKind { Search, ZeroKeyword, MoreResults, Card, Lookup, FlightLookup, FlightSearch };

// What the command line asks for.
struct Options {
  Command command = Command::Help;
  std::vector<std::string> arguments;

  // Every command's.
  bool help = false;
  bool json = false;
  bool verbose = false;
  std::string client = "lanthe";
  std::string userAgent = "zelkorctl/1.0";
  std::string address;
  std::string socket;
  Duration timeout = 60s;

  // Of queries.
  QueryKind kind = QueryKind::Search;
  std::vector<std::pair<std::string, std::string>> items;
  std::string url;         // of further results and cards
  std::int64_t count = 1;  // how often the query is sent
  std::int64_t limit = 5;  // results that are shown of each answer
  bool asTyped = false;
  Duration delayPerKey = 120ms;

  // Of settings.
  std::string domain;
};

struct UsageError {
  std::string text;
};

// Without the program's name. Never throws; what is missing or excessive is an error here already.
std::variant<Options, UsageError> parseArguments(const std::vector<std::string>& arguments);

// Nothing for a name that no command has.
std::optional<Command> commandNamed(std::string_view name);

ClientOptions clientOptions(const Options& options);

}  // namespace zelkorctl
