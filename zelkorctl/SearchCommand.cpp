#include <poll.h>

#include <algorithm>
#include <thread>

#include "corezelkor/client/ClientError.h"
#include "zelkorctl/AnswerText.h"
#include "zelkorctl/Commands.h"
#include "zelkorctl/QueryRun.h"

namespace zelkorctl {
namespace {

std::string joinedWords(const std::vector<std::string>& words) {
  std::string text;
  for (const auto& word : words) text += (text.empty() ? "" : " ") + word;
  return text;
}

// Every beginning of the text that ends with a whole character.
std::vector<std::string> prefixesOf(const std::string& text) {
  std::vector<std::string> prefixes;
  for (std::size_t end = 1; end <= text.size(); ++end) {
    const bool inside = end < text.size() && (static_cast<unsigned char>(text[end]) & 0xC0) == 0x80;
    if (!inside) prefixes.push_back(text.substr(0, end));
  }
  return prefixes;
}

void showOutcome(const Invocation& invocation, const Outcome& outcome) {
  const auto& [options, surroundings] = invocation;
  auto& out = surroundings.out;
  if (options.json) {
    out << json::serialize(outcomeJson(outcome)) << std::endl;
    return;
  }
  out << outcomeLine(outcome, surroundings.columns) << '\n';
  if (!outcome.answer.reply) return;
  if (options.verbose) {
    for (const auto& line : exchangeLines(*outcome.answer.reply)) surroundings.err << line << '\n';
  }
}

void showResults(const Invocation& invocation, const Outcome& outcome) {
  const auto& [options, surroundings] = invocation;
  if (options.json || !outcome.answer.reply) return;
  const auto lines = resultLines(outcome.answer.reply->data.view(),
                                 static_cast<std::size_t>(options.limit), surroundings.columns);
  for (const auto& line : lines) surroundings.out << line << '\n';
}

int statusOf(const std::vector<Outcome>& outcomes) {
  int status = kAnswered;
  for (const auto& outcome : outcomes) {
    const auto& error = outcome.answer.error;
    if (!error) continue;
    if (isClientError(*error, ClientErrorCode::NotReachable)) return kNotReachable;
    status = kErrorReply;
  }
  return status;
}

int searchOneByOne(const Invocation& invocation, QueryRun& run, const std::string& text) {
  std::vector<Outcome> all;
  for (std::int64_t i = 0; i < invocation.options.count; ++i) {
    run.send(text);
    for (auto& outcome : run.takeAll()) {
      showOutcome(invocation, outcome);
      if (i + 1 == invocation.options.count) showResults(invocation, outcome);
      outcome.answer.reply.reset();
      all.push_back(std::move(outcome));
    }
    if (statusOf(all) == kNotReachable) break;
  }
  return statusOf(all);
}

int searchAsTyped(const Invocation& invocation, QueryRun& run, const std::string& text) {
  const auto prefixes = prefixesOf(text);
  for (std::int64_t i = 0; i < invocation.options.count; ++i) {
    for (const auto& prefix : prefixes) {
      if (&prefix != &prefixes.front()) std::this_thread::sleep_for(invocation.options.delayPerKey);
      run.send(prefix);
    }
  }
  auto outcomes = run.takeAll();
  std::sort(outcomes.begin(), outcomes.end(),
            [](const Outcome& a, const Outcome& b) { return a.answer.queryId < b.answer.queryId; });
  for (const auto& outcome : outcomes) showOutcome(invocation, outcome);
  if (!outcomes.empty()) showResults(invocation, outcomes.back());
  return statusOf(outcomes);
}

}  // namespace

int runSearch(const Invocation& invocation) {
  const auto text = joinedWords(invocation.options.arguments);
  Client client(clientOptions(invocation.options));
  QueryRun run(client, invocation.options);
  return invocation.options.asTyped ? searchAsTyped(invocation, run, text)
                                    : searchOneByOne(invocation, run, text);
}

}  // namespace zelkorctl
