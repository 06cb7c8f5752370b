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

enum class Command {
  Search,
  Type,
  More,
  Card,
  Lookup,
  ZeroKeyword,
  Images,
  Bag,
  Defaults,
  Sessions,
  Feedback,
  Report,
  Containers,
  Metrics,
  Status,
  Version,
  Help,
};

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
  std::vector<std::string> urls;  // of images; the last one of further results or a card
  std::int64_t count = 1;         // how often the query is sent
  std::int64_t limit = 5;         // results that are shown of each answer
  bool asTyped = false;
  Duration delayPerKey = 120ms;
  bool endpoint = false;    // asked on the second connection
  std::int64_t pages = 1;   // of further results
  std::int64_t result = 1;  // whose card is shown

  // Of lookups.
  std::optional<std::string> context;  // the text around; by default the selected text itself
  std::uint32_t selectionType = 1;
  std::string appBundleId;
  std::string hintDomain;

  // Of images.
  std::vector<std::string> identifiers;
  std::string folder;  // where they are saved; empty: they are not
  Duration deadline = 5s;

  // Of reports.
  std::string event;
  std::int64_t queryId = 0;

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

// What the command line is read by, for those that hold the documents against it.
std::vector<std::pair<std::string_view, Command>> allCommands();
std::vector<std::string_view> optionsOf(Command command);  // every command's too

// The address that was given for further results or a card; empty for none.
std::string urlOf(const Options& options);

ClientOptions clientOptions(const Options& options);

}  // namespace zelkorctl
