#include "zelkorctl/QueryOutput.h"

#include <algorithm>

#include "corezelkor/client/ClientError.h"
#include "zelkorctl/AnswerText.h"

namespace zelkorctl {

void showOutcome(const Invocation& invocation, const Outcome& outcome) {
  const auto& [options, surroundings] = invocation;
  auto& out = surroundings.out;
  if (options.json) {
    const auto exchange = options.verbose ? Exchange::Told : Exchange::LeftOut;
    out << json::serialize(outcomeJson(outcome, exchange)) << std::endl;
    return;
  }
  for (const auto& line : outcomeLines(outcome, surroundings.columns)) out << line << '\n';
  if (!outcome.answer.reply || !options.verbose) return;
  for (const auto& line : exchangeLines(*outcome.answer.reply)) surroundings.err << line << '\n';
}

void showResults(const Invocation& invocation, const Outcome& outcome) {
  const auto& [options, surroundings] = invocation;
  if (options.json || !outcome.answer.reply) return;
  const Shown shown{static_cast<std::size_t>(options.limit), surroundings.columns, outcome.text};
  const auto lines = resultLines(outcome.answer, shown);
  for (const auto& line : lines) surroundings.out << line << '\n';
}

void showCards(const Invocation& invocation, const Outcome& outcome) {
  const auto& [options, surroundings] = invocation;
  if (options.json || !outcome.answer.reply) return;
  for (const auto& line : cardLines(outcome.answer.reply->data.view(), surroundings.columns)) {
    surroundings.out << line << '\n';
  }
}

int statusOf(const Outcome& outcome) {
  const auto& error = outcome.answer.error;
  if (!error) return kAnswered;
  return isClientError(*error, ClientErrorCode::NotReachable) ? kNotReachable : kErrorReply;
}

int statusOf(const std::vector<Outcome>& outcomes) {
  int status = kAnswered;
  for (const auto& outcome : outcomes) status = std::max(status, statusOf(outcome));
  return status;
}

std::string joinedWords(const std::vector<std::string>& words) {
  std::string text;
  for (const auto& word : words) text += (text.empty() ? "" : " ") + word;
  return text;
}

}  // namespace zelkorctl
