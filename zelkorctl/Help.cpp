#include "zelkorctl/Help.h"

namespace zelkorctl {
namespace {

constexpr std::string_view kOverview = R"(usage: zelkorctl COMMAND [OPTION...]

Asks and inspects zelkord, the broker of search suggestions.

Commands:
  search TEXT...   send a query and show its results
  type             search while you type
  more TEXT...     further results of a query
  card TEXT...     the details of a result
  lookup TEXT...   what a selected text means
  zkw              suggestions before anything is typed
  images TEXT...   load the images of a query's results
  bag              show the configuration document
  defaults         read and write settings
  sessions         list the clients that the daemon knows
  feedback         show the feedback records that the daemon has in memory
  report CLASS     report feedback
  containers       show the feedback sessions on the disk
  metrics          show the daemon's counters
  status           show the daemon's state
  version          show this tool's version
  help [COMMAND]   this text, or a command's

Options of every command:
  --json               machine-readable output
  --client IDENTIFIER  speak as this client (default: lanthe)
  --user-agent TEXT    with this user agent (default: zelkorctl/1.0)
  --address ADDRESS    D-Bus address of the daemon's private door
  --socket PATH        the same, as a socket's path
  --timeout SECONDS    for every call (default: 60)
  --verbose            say more, on standard error
  --version            show this tool's version
  -h, --help           the command's help

Options of a command stand behind its name. A value stands behind its option, or behind "=". Words
behind "--" are no options, and a word "++" stands there.

Without --address and --socket the session bus is asked, which starts the daemon when needed;
without a session bus the socket in the runtime directory is used.

Exit status: 0 answered, 1 an error came back or the output cannot be written, 2 wrong usage, 3 the
daemon cannot be reached.
)";

constexpr std::string_view kSearch = R"(usage: zelkorctl search [OPTION...] TEXT...

Sends TEXT as a query and shows the best results. Words are joined by a space. Beside the time
stands where the answer is from: the daemon's cache, or the network.

  --kind KIND          search (default), zeroKeyword, moreResults, card, lookup, flightLookup
                       or flightSearch
  --url URL            where further results or a card are fetched from (default: the bag's)
  --item NAME=VALUE    add a query item; may be repeated
  --count N            send the query N times, one after the other
  --limit N            show at most N results of an answer (default: 5)
  --as-typed           send every prefix of TEXT as a keystroke; tell which were answered,
                       stale or dropped, and how long each took
  --delay-per-key MS   between two keystrokes (default: 120)
  --verbose            also show the request that went to the service and its response
)";

constexpr std::string_view kType = R"(usage: zelkorctl type [OPTION...]

Searches on every keystroke and shows the results under the line, with how long the answer took
and whether it is from the daemon's cache or the network, on a screen of its own. Backspace deletes,
Ctrl-U clears, Enter starts afresh, Ctrl-C or Ctrl-D ends.

When standard input is no terminal, each of its characters is a keystroke and each line a query;
every answer is one line.

  --item NAME=VALUE    add a query item; may be repeated
  --limit N            show at most N results (default: 5)
  --delay-per-key MS   between two keystrokes of such input (default: 120)
)";

constexpr std::string_view kMore = R"(usage: zelkorctl more [OPTION...] TEXT...
       zelkorctl more [OPTION...] --url URL

Searches for TEXT and fetches the further results that the answer names.

  --url URL            fetch these, without a search
  --pages N            follow up to N pages (default: 1)
  --endpoint           ask on the daemon's second connection
  --item NAME=VALUE    add a query item; may be repeated
  --limit N            show at most N results of a page (default: 5)
  --verbose            also show the request that went to the service and its response
)";

constexpr std::string_view kCard = R"(usage: zelkorctl card [OPTION...] TEXT...
       zelkorctl card [OPTION...] --url URL

Searches for TEXT and shows the card of a result.

  --result N           of the N-th result of the answer (default: 1)
  --url URL            fetch this card, without a search
  --endpoint           ask on the daemon's second connection
  --item NAME=VALUE    add a query item; may be repeated
  --verbose            also show the request that went to the service and its response
)";

constexpr std::string_view kLookup = R"(usage: zelkorctl lookup [OPTION...] TEXT...

Looks up TEXT as if it was selected in a text. The daemon keeps the results that fit the context.

  --context TEXT       the text around it (default: the selected text alone)
  --selection TYPE     default, explicit (default) or hint
  --app IDENTIFIER     the application in which it was selected
  --hint-domain NAME   domain of the hint
  --item NAME=VALUE    add a query item; may be repeated
  --limit N            show at most N results (default: 5)
  --verbose            also show the request that went to the service and its response
)";

constexpr std::string_view kZeroKeyword = R"(usage: zelkorctl zkw [OPTION...]

Shows what the service suggests before anything is typed.

  --item NAME=VALUE    add a query item; may be repeated
  --limit N            show at most N results (default: 5)
  --verbose            also show the request that went to the service and its response
)";

constexpr std::string_view kImages = R"(usage: zelkorctl images [OPTION...] TEXT...
       zelkorctl images [OPTION...] [--url URL]... [--id IDENTIFIER]...

Searches for TEXT and loads the images that the answer describes, or loads the images that are
named. The exit status is 1 when one of them does not come. On a terminal that shows images those
that are PNG are shown.

  --url URL            load this image; may be repeated
  --id IDENTIFIER      load the image that the bag has under this name; may be repeated
  --save DIR           save them in DIR, under the last part of their URL or their identifier
  --deadline MS        take what is there by then (default: 5000)
  --item NAME=VALUE    add a query item to the search; may be repeated
)";

constexpr std::string_view kDefaults = R"(usage: zelkorctl defaults read KEY [--domain DOMAIN]
       zelkorctl defaults write KEY JSON [--domain DOMAIN]
       zelkorctl defaults delete KEY [--domain DOMAIN]
       zelkorctl defaults list [--domain DOMAIN]

Reads and writes settings. Values are JSON; a text has its quotes. The daemon is asked; when none
runs and none can be started, the user's store is opened instead.

`list` shows all settings that have a value; from the store alone, those that were written.

  --domain DOMAIN      instead of the daemon's own settings
)";

constexpr std::string_view kBag = R"(usage: zelkorctl bag [OPTION...]

Shows the configuration document that the service gave, as the client sees it.
)";

constexpr std::string_view kSessions = R"(usage: zelkorctl sessions [OPTION...]

Lists the clients that the daemon knows, with their user agents.
)";

constexpr std::string_view kFeedback = R"(usage: zelkorctl feedback [OPTION...]

Shows the records of the current feedback session that the daemon has in memory, one JSON object a
line. In normal operation there are none: sessions keep their records on the disk.
)";

constexpr std::string_view kReport = R"(usage: zelkorctl report [OPTION...] CLASS [JSON]

Reports feedback of CLASS, such as HVResultEngagementFeedback, with the fields in JSON: names and
types are those of its message in Feedback.proto, enumerations are numbers. Without JSON all fields
have their defaults; "-" reads it from standard input. Waits until the daemon has taken or refused
it.

  --event NAME         the event's name
  --query-id N         the query that it belongs to (default: 0)
)";

constexpr std::string_view kContainers = R"(usage: zelkorctl containers [OPTION...] [NUMBER]

Lists the feedback sessions on the disk, or shows one: its version, its header and its records,
with the field names of Feedback.proto. A damaged file is refused, with the reason and the place.
Reads the files themselves; no daemon is needed.
)";

constexpr std::string_view kMetrics = R"(usage: zelkorctl metrics [OPTION...]

Shows the daemon's counters, cumulative over its restarts.
)";

constexpr std::string_view kStatus = R"(usage: zelkorctl status [OPTION...]

Shows what the daemon says of itself, and how its last attempt to fetch the configuration failed.
)";

constexpr std::string_view kVersion = R"(usage: zelkorctl version

Shows this tool's version.
)";

}  // namespace

std::string_view helpText(Command command) {
  switch (command) {
    case Command::Search:
      return kSearch;
    case Command::Type:
      return kType;
    case Command::More:
      return kMore;
    case Command::Card:
      return kCard;
    case Command::Lookup:
      return kLookup;
    case Command::ZeroKeyword:
      return kZeroKeyword;
    case Command::Images:
      return kImages;
    case Command::Bag:
      return kBag;
    case Command::Defaults:
      return kDefaults;
    case Command::Sessions:
      return kSessions;
    case Command::Feedback:
      return kFeedback;
    case Command::Report:
      return kReport;
    case Command::Containers:
      return kContainers;
    case Command::Metrics:
      return kMetrics;
    case Command::Status:
      return kStatus;
    case Command::Version:
      return kVersion;
    case Command::Help:
      break;
  }
  return kOverview;
}

}  // namespace zelkorctl
