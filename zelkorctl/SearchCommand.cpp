#include <algorithm>
#include <thread>

#include "zelkorctl/Commands.h"
#include "zelkorctl/QueryOutput.h"
#include "zelkorctl/QueryRun.h"

namespace zelkorctl {
namespace {

// Every beginning of the text that ends with a whole character.
std::vector<std::string> prefixesOf(const std::string& text) {
  std::vector<std::string> prefixes;
  for (std::size_t end = 1; end <= text.size(); ++end) {
    const bool inside = end < text.size() && (static_cast<unsigned char>(text[end]) & 0xC0) == 0x80;
    if (!inside) prefixes.push_back(text.substr(0, end));
  }
  return prefixes;
}

int searchOneByOne(const Invocation& invocation, QueryRun& run, const Query& query) {
  std::vector<Outcome> all;
  for (std::int64_t i = 0; i < invocation.options.count; ++i) {
    run.send(query);
    for (auto& outcome : run.takeAll()) {
      showOutcome(invocation, outcome);
      if (i + 1 == invocation.options.count) showResults(invocation, outcome);
      outcome.answer.reply.reset();
      all.push_back(std::move(outcome));
    }
    if (statusOf(all) == kNotReachable || !invocation.surroundings.out.good()) break;
  }
  return statusOf(all);
}

int searchAsTyped(const Invocation& invocation, QueryRun& run, const Query& query) {
  const auto prefixes = prefixesOf(query.text);
  for (std::int64_t i = 0; i < invocation.options.count; ++i) {
    for (const auto& prefix : prefixes) {
      if (&prefix != &prefixes.front()) std::this_thread::sleep_for(invocation.options.delayPerKey);
      run.send({query.kind, prefix, query.url});
    }
  }
  auto outcomes = run.takeAll();
  std::sort(outcomes.begin(), outcomes.end(),
            [](const Outcome& a, const Outcome& b) { return a.answer.queryId < b.answer.queryId; });
  for (const auto& outcome : outcomes) showOutcome(invocation, outcome);
  if (!outcomes.empty()) showResults(invocation, outcomes.back());
  return statusOf(outcomes);
}

int askOnce(const Invocation& invocation, const Query& query) {
  Client client(clientOptions(invocation.options));
  QueryRun run(client, invocation.options);
  const auto outcome = run.ask(query);
  showOutcome(invocation, outcome);
  showResults(invocation, outcome);
  return statusOf(outcome);
}

}  // namespace

int runSearch(const Invocation& invocation) {
  const auto& options = invocation.options;
  const Query query{options.kind, joinedWords(options.arguments), urlOf(options)};
  Client client(clientOptions(options));
  QueryRun run(client, options);
  return options.asTyped ? searchAsTyped(invocation, run, query)
                         : searchOneByOne(invocation, run, query);
}

int runLookup(const Invocation& invocation) {
  return askOnce(invocation, {QueryKind::Lookup, joinedWords(invocation.options.arguments), {}});
}

int runZeroKeyword(const Invocation& invocation) {
  return askOnce(invocation, {QueryKind::ZeroKeyword, {}, {}});
}

}  // namespace zelkorctl
