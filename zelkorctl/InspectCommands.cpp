#include <algorithm>

#include "corezelkor/client/ClientError.h"
#include "corezelkor/client/DiagnosticsClient.h"
#include "zelkorctl/AnswerText.h"
#include "zelkorctl/BagFetch.h"
#include "zelkorctl/Commands.h"
#include "zelkorctl/Printable.h"

namespace zelkorctl {
namespace {

void printJson(const Invocation& invocation, const json::value& value) {
  invocation.surroundings.out << json::serialize(value) << '\n';
}

// A text as it is, anything else as compact JSON.
std::string plainText(const json::value& value) {
  return value.is_string() ? std::string(value.get_string()) : json::serialize(value);
}

template <typename Entries, typename NameOf>
std::size_t longestName(const Entries& entries, const NameOf& nameOf) {
  std::size_t longest = 0;
  for (const auto& entry : entries) {
    longest = std::max(longest, displayWidth(printable(nameOf(entry))));
  }
  return longest;
}

void printObject(const Invocation& invocation, const json::object& object) {
  const auto columns = longestName(object, [](const auto& entry) { return entry.key(); });
  for (const auto& entry : object) {
    printPair(invocation, entry.key(), plainText(entry.value()), columns);
  }
}

// What a call gave that must have given something.
template <typename T>
int reportMissing(const Invocation& invocation, const ClientResult<T>& result) {
  return reportError(invocation, result.error.value_or(clientError(ClientErrorCode::BadReply,
                                                                   "the daemon gave nothing")));
}

// With why, as far as the daemon tells.
int reportNoBag(const Invocation& invocation, Client& client, const Error& error) {
  const auto future = DiagnosticsClient(client).status();
  const auto bag = missingBagIn(future.get().value.value_or(""));
  if (!bag) return reportError(invocation, error);
  if (invocation.options.json) {
    printJson(invocation, json::object{{"error", errorJson(error)}, {"bag", *bag}});
  } else {
    invocation.surroundings.err << "zelkorctl: no bag: " << bagFetchText(*bag) << '\n';
  }
  return kErrorReply;
}

void printBag(const Invocation& invocation, const ClientBag& bag) {
  const auto document = parseJson(bag.rawBag);
  if (invocation.options.json) {
    json::object object{{"enabled", bag.enabled}, {"feedbackEnabled", bag.feedbackEnabled}};
    if (bag.version) object["version"] = *bag.version;
    if (document) object["bag"] = *document;
    printJson(invocation, object);
    return;
  }
  printPair(invocation, "version", bag.version.value_or("none"), 8);
  printPair(invocation, "enabled", bag.enabled ? "yes" : "no", 8);
  printPair(invocation, "feedback", bag.feedbackEnabled ? "yes" : "no", 8);
  if (!document || !document->is_object()) return;
  invocation.surroundings.out << '\n';
  printObject(invocation, document->get_object());
}

}  // namespace

int runBag(const Invocation& invocation) {
  Client client(clientOptions(invocation.options));
  const auto future = client.bag();
  const auto& result = future.get();
  if (mayMeanNoBag(result.error)) return reportNoBag(invocation, client, *result.error);
  if (!result.value) return reportMissing(invocation, result);
  printBag(invocation, *result.value);
  return kAnswered;
}

int runSessions(const Invocation& invocation) {
  Client client(unconfigured(invocation.options));
  const auto future = client.listSessions();
  const auto& result = future.get();
  if (!result.value) return reportMissing(invocation, result);
  if (invocation.options.json) {
    json::array list;
    for (const auto& [identifier, agent] : *result.value) {
      list.push_back({{"identifier", identifier}, {"agent", agent}});
    }
    printJson(invocation, list);
    return kAnswered;
  }
  const auto columns =
      longestName(*result.value, [](const auto& entry) { return entry.identifier; });
  for (const auto& entry : *result.value) {
    printPair(invocation, entry.identifier, entry.agent, columns);
  }
  return kAnswered;
}

int runMetrics(const Invocation& invocation) {
  Client client(unconfigured(invocation.options));
  const auto future = DiagnosticsClient(client).metrics();
  const auto& result = future.get();
  if (!result.value) return reportMissing(invocation, result);
  json::object object;
  for (const auto& [key, value] : *result.value) object[key] = value;
  if (invocation.options.json) {
    printJson(invocation, object);
  } else {
    printObject(invocation, object);
  }
  return kAnswered;
}

int runStatus(const Invocation& invocation) {
  Client client(unconfigured(invocation.options));
  const auto future = DiagnosticsClient(client).status();
  const auto& result = future.get();
  if (!result.value) return reportMissing(invocation, result);
  const auto status = parseJson(*result.value);
  if (!status || !status->is_object()) {
    return reportError(invocation, clientError(ClientErrorCode::BadReply, "no JSON object"));
  }
  if (invocation.options.json) {
    printJson(invocation, *status);
  } else {
    printObject(invocation, status->get_object());
    if (const auto bag = missingBagIn(*result.value); bag && objectIn(*bag, "last_failure")) {
      invocation.surroundings.out << '\n' << bagFetchText(*bag) << '\n';
    }
  }
  return kAnswered;
}

}  // namespace zelkorctl
