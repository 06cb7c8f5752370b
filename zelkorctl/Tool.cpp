#include "zelkorctl/Tool.h"

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "zelkorctl/Commands.h"
#include "zelkorctl/Help.h"
#include "zelkorctl/Printable.h"

namespace zelkorctl {
namespace {

int runHelp(const Invocation& invocation) {
  auto subject = invocation.options.command;
  if (subject == Command::Help && !invocation.options.arguments.empty()) {
    const auto& name = invocation.options.arguments.front();
    const auto named = commandNamed(name);
    if (!named) {
      invocation.surroundings.err << "zelkorctl: no command '" << printable(name) << "'\n";
      return kWrongUsage;
    }
    subject = *named;
  }
  invocation.surroundings.out << helpText(subject);
  return kAnswered;
}

int runVersion(const Invocation& invocation) {
  if (invocation.options.json) {
    invocation.surroundings.out << "{\"version\":\"" ZK_VERSION "\"}\n";
  } else {
    invocation.surroundings.out << "zelkorctl " ZK_VERSION "\n";
  }
  return kAnswered;
}

int runCommand(const Invocation& invocation) {
  if (invocation.options.help) return runHelp(invocation);
  switch (invocation.options.command) {
    case Command::Search:
      return runSearch(invocation);
    case Command::Type:
      return runType(invocation);
    case Command::More:
      return runMore(invocation);
    case Command::Card:
      return runCard(invocation);
    case Command::Lookup:
      return runLookup(invocation);
    case Command::ZeroKeyword:
      return runZeroKeyword(invocation);
    case Command::Images:
      return runImages(invocation);
    case Command::Bag:
      return runBag(invocation);
    case Command::Defaults:
      return runDefaults(invocation);
    case Command::Sessions:
      return runSessions(invocation);
    case Command::Feedback:
      return runFeedback(invocation);
    case Command::Report:
      return runReport(invocation);
    case Command::Containers:
      return runContainers(invocation);
    case Command::Metrics:
      return runMetrics(invocation);
    case Command::Status:
      return runStatus(invocation);
    case Command::Version:
      return runVersion(invocation);
    case Command::Help:
      return runHelp(invocation);
  }
  return kWrongUsage;
}

// The status, unless what was to be said could not be.
int withOutput(const Surroundings& surroundings, int status) {
  errno = 0;
  surroundings.out.flush();
  const int problem = errno;
  if (surroundings.out.good()) return status;
  surroundings.err << "zelkorctl: the output could not be written";
  if (problem != 0) surroundings.err << ": " << std::strerror(problem);
  surroundings.err << std::endl;
  return std::max<int>(status, kErrorReply);
}

}  // namespace

int runTool(const std::vector<std::string>& arguments, const Surroundings& surroundings) {
  const auto parsed = parseArguments(arguments);
  if (const auto* wrong = std::get_if<UsageError>(&parsed)) {
    surroundings.err << "zelkorctl: " << printable(wrong->text) << "\nTry 'zelkorctl --help'.\n";
    return kWrongUsage;
  }
  const auto status = runCommand({std::get<Options>(parsed), surroundings});
  return withOutput(surroundings, status);
}

}  // namespace zelkorctl
