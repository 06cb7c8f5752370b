#pragma once

#include <optional>
#include <string_view>

#include "base/Error.h"
#include "corezelkor/client/Client.h"
#include "zelkorctl/Options.h"
#include "zelkorctl/Surroundings.h"

namespace zelkorctl {

// What the tool was started with, for its commands.
struct Invocation {
  const Options& options;
  const Surroundings& surroundings;
};

// Each gives the exit status.
int runSearch(const Invocation& invocation);
int runType(const Invocation& invocation);
int runMore(const Invocation& invocation);
int runCard(const Invocation& invocation);
int runLookup(const Invocation& invocation);
int runZeroKeyword(const Invocation& invocation);
int runImages(const Invocation& invocation);
int runBag(const Invocation& invocation);
int runDefaults(const Invocation& invocation);
int runSessions(const Invocation& invocation);
int runFeedback(const Invocation& invocation);
int runReport(const Invocation& invocation);
int runContainers(const Invocation& invocation);
int runMetrics(const Invocation& invocation);
int runStatus(const Invocation& invocation);

// Says the error, on the output with --json, and gives the status that stands for it.
int reportError(const Invocation& invocation, const Error& error);

// For commands that look inside: no configuration is sent, so that the daemon makes no state.
ClientOptions unconfigured(const Options& options);

// The name and the value, aligned when `nameColumns` is given; printable.
void printPair(const Invocation& invocation, std::string_view name, std::string_view value,
               std::size_t nameColumns = 0);

}  // namespace zelkorctl
