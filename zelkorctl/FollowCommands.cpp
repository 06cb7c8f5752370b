#include <fmt/format.h>

#include <optional>

#include "corezelkor/client/ClientError.h"
#include "zelkorctl/Commands.h"
#include "zelkorctl/FollowUps.h"
#include "zelkorctl/QueryOutput.h"
#include "zelkorctl/QueryRun.h"

namespace zelkorctl {
namespace {

// A search whose answer leads on to what the command is for.
class Following {
 public:
  explicit Following(const Invocation& invocation)
      : invocation_(invocation),
        client_(clientOptions(invocation.options)),
        run_(client_, invocation.options) {}

  Outcome search() {
    return run_.ask({QueryKind::Search, joinedWords(invocation_.options.arguments), {}});
  }

  // Shows why a search leads to nothing.
  int endOfTheWay(const Outcome& searched, const std::string& missing) const {
    if (searched.answer.reply) {
      return reportError(invocation_, clientError(ClientErrorCode::BadReply, missing));
    }
    showOutcome(invocation_, searched);
    return searched.answer.error ? statusOf(searched) : kErrorReply;
  }

  Outcome follow(QueryKind kind, const std::string& url) {
    const auto outcome = run_.ask({kind, {}, url});
    showOutcome(invocation_, outcome);
    return outcome;
  }

 private:
  const Invocation& invocation_;
  Client client_;
  QueryRun run_;
};

std::optional<std::string> nextPage(const Outcome& outcome) {
  return moreResultsURL(outcome.answer, outcome.text);
}

}  // namespace

int runMore(const Invocation& invocation) {
  Following following(invocation);
  std::optional<std::string> url = urlOf(invocation.options);
  if (url->empty()) {
    const auto searched = following.search();
    url = nextPage(searched);
    if (!url) return following.endOfTheWay(searched, "the results name no further ones");
  }
  int status = kAnswered;
  for (std::int64_t page = 0; url && page < invocation.options.pages; ++page) {
    const auto outcome = following.follow(QueryKind::MoreResults, *url);
    showResults(invocation, outcome);
    status = statusOf(outcome);
    url = nextPage(outcome);
  }
  return status;
}

int runCard(const Invocation& invocation) {
  Following following(invocation);
  std::optional<std::string> url = urlOf(invocation.options);
  if (url->empty()) {
    const auto searched = following.search();
    const auto number = static_cast<std::size_t>(invocation.options.result);
    url = cardURL(searched.answer, searched.text, number);
    if (!url) {
      return following.endOfTheWay(searched, fmt::format("result {} has no card", number));
    }
  }
  const auto outcome = following.follow(QueryKind::Card, *url);
  showCards(invocation, outcome);
  return statusOf(outcome);
}

}  // namespace zelkorctl
