#include <unistd.h>

#include <cerrno>

#include "corezelkor/client/ClientError.h"
#include "zelkorctl/Commands.h"
#include "zelkorctl/FeedbackMessages.h"
#include "zelkorctl/Printable.h"

namespace zelkorctl {
namespace {

// A message may have a megabyte; its JSON is longer.
constexpr std::size_t kLongestInput = 16 * 1024 * 1024;

std::string readInput(int descriptor) {
  std::string text;
  char piece[4096];
  while (text.size() < kLongestInput) {
    const auto count = ::read(descriptor, piece, sizeof piece);
    if (count < 0 && errno == EINTR) continue;
    if (count <= 0) break;
    text.append(piece, static_cast<std::size_t>(count));
  }
  return text;
}

// The message's fields: the second argument, standard input for "-", none for neither.
std::string fieldsOf(const Invocation& invocation) {
  const auto& arguments = invocation.options.arguments;
  if (arguments.size() < 2) return "{}";
  return arguments[1] == "-" ? readInput(invocation.surroundings.input) : arguments[1];
}

int sayAccepted(const Invocation& invocation, const std::string& className) {
  if (invocation.options.json) {
    invocation.surroundings.out << json::serialize(json::object{{"accepted", className}}) << '\n';
  } else {
    invocation.surroundings.out << "accepted " << className << '\n';
  }
  return kAnswered;
}

}  // namespace

int runFeedback(const Invocation& invocation) {
  Client client(clientOptions(invocation.options));
  const auto future = client.feedback("");
  const auto& result = future.get();
  if (result.error) return reportError(invocation, *result.error);
  json::array list;
  for (const auto& text : result.value.value_or(std::vector<std::string>())) {
    list.push_back(parseJson(text).value_or(json::value(text)));
  }
  auto& out = invocation.surroundings.out;
  if (invocation.options.json) {
    out << json::serialize(list) << '\n';
    return kAnswered;
  }
  for (const auto& record : list) out << printable(json::serialize(record)) << '\n';
  if (list.empty() && invocation.surroundings.outputIsTerminal) {
    out << "No records in memory: sessions keep them on the disk (zelkorctl containers).\n";
  }
  return kAnswered;
}

int runReport(const Invocation& invocation) {
  const auto& options = invocation.options;
  const auto& className = options.arguments.front();
  std::string problem;
  auto message = messageFromJson(className, fieldsOf(invocation), problem);
  if (!message) {
    invocation.surroundings.err << "zelkorctl: " << printable(problem) << '\n';
    return kWrongUsage;
  }
  Client client(clientOptions(options));
  const auto future =
      client.reportEvent(options.event, options.queryId, className, *std::move(message));
  const auto& result = future.get();
  if (result.error) return reportError(invocation, *result.error);
  return sayAccepted(invocation, className);
}

}  // namespace zelkorctl
